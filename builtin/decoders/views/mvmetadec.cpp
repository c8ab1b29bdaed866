#include "builtin/decoders/views/mvmetadec.h"

#include <cstring>

#include "builtin/creators.h"
#include "builtin/decoders/views/mvstream.h"
#include "builtin/shared/inputnesting.h"
#include "core/arch/qvassert.h"
#include "core/engine/modules/params.h"
#include "core/engine/status.h"
#include "core/measure/qvgeometry.h"

namespace {

constexpr QvParamRow<MVMetaDec::Settings> rows[] = {
    {.name = "layout",
     .flags = qvParamByHand,
     .help = "interleaved, swapped, side-by-side, top-bottom, line-by-line, left or right",
     .type = Any::String},
    {.name = "metaState", .flags = qvParamByHand, .help = "the set-up of the views", .type = Any::Dict},
    {.name = "openParameters",
     .flags = qvParamByHand,
     .help = "with which the inputs are opened",
     .type = Any::Dict},
    {.name = "inputFailure",
     .flags = qvParamReadOnly | qvParamByHand,
     .help = "why it did not open",
     .type = Any::String},
    {.name = "inputFiles",
     .flags = qvParamReadOnly | qvParamByHand,
     .help = "the files of all inputs",
     .type = Any::Vector},
    {.name = "filesize",
     .flags = qvParamReadOnly | qvParamByHand,
     .unit = "bytes",
     .help = "all inputs together",
     .type = Any::Int64},
    {.name = "isMeta",
     .flags = qvParamReadOnly | qvParamByHand,
     .help = "1: the set-up comes from memory",
     .type = Any::Int32},
    {.name = "metaData",
     .flags = qvParamReadOnly | qvParamByHand,
     .help = "the set-up for a metafile",
     .type = Any::Vector},
};
static_assert(qvParamTableOk<MVMetaDec::Settings>(rows));

constexpr const char* elementName = "MVInterleave";

// A sound of the first input; its decoder keeps the samples.
class ViewSound : public DPipeAudioStream {
  public:
    ViewSound(QvDecodePipe& input, int number) : input_(input), number_(number) {
        input_.getStreamParams(qvAudioStream, number_, params);
    }
    int select() override { return change(&QvDecodePipe::select, true); }
    int deselect() override { return change(&QvDecodePipe::deselect, false); }

  private:
    QvDecodePipe& input_;
    int number_;

    int change(int (QvDecodePipe::*how)(int, int), bool now) {
        const int result = (input_.*how)(qvAudioStream, number_);
        if (result == QvStatus::ok) selected = now;
        return result;
    }
};

}  // namespace

MVMetaDec::MVMetaDec(const QvModule* module) : BaseDecodePipe(module) {}

MVMetaDec::~MVMetaDec() = default;

int MVMetaDec::setParam(const char* name, const Any& value) {
    const auto is = [name](const char* other) { return std::strcmp(name, other) == 0; };
    std::string fault;
    if (const auto result = source_.set(name, value, fault)) {
        _traceParam(name, value);
        return fault.empty() ? *result : setError(*result, "%s", fault.c_str());
    }
    if (is("layout")) {
        _traceParam(name, value);
        const std::string text = value.toString().asString("");
        QvViewLayout found{};
        if (!text.empty() && !QvViewSetup::findLayout(text, found))
            return setError(QvStatus::invalidParam, "'%s' is no layout of views", text.c_str());
        settings_.layout = text;
        return QvStatus::ok;
    }
    if (is("settings")) {  // of a stored state
        if (!value.isDict()) return QvStatus::invalidParam;
        const AnyDict& stored = value.asDict();
        if (stored.get("openParameters").isDict()) source_.openParams = stored.get("openParameters").asDict();
        return stored.isSet("layout") ? setParam("layout", stored.get("layout")) : QvStatus::ok;
    }
    return BaseDecodePipe::setParam(name, value);
}

void MVMetaDec::getParam(const char* name, Any& value) const {
    const auto is = [name](const char* other) { return std::strcmp(name, other) == 0; };
    const MVStream* shown = picture();
    if (source_.get(name, value)) return;
    if (is("layout")) {
        value = settings_.layout.c_str();
    } else if (is("inputFailure")) {
        value = inputFailure_.c_str();
    } else if (is("isMeta")) {
        value = !source_.filename.isValid() && !source_.state.empty() ? 1 : 0;
    } else if (is("metaData")) {
        value = AnyVector();
        value.asVector().append(Any(elementName));
        value.asVector().append(Any(source_.state));
    } else if (is("store")) {
        AnyDict settings;
        if (!source_.openParams.empty()) settings.set("openParameters", source_.openParams);
        if (!settings_.layout.empty()) settings.set("layout", settings_.layout.c_str());
        if (!settings.empty()) value = AnyDict("settings", settings);
    } else if (is("inputFiles")) {
        value = AnyVector();
        for (std::size_t i = 0; shown && i < shown->inputs().size(); ++i) {
            const QvDecodePipe& input = shown->inputs()[i].decoder();
            if (const Any file = input.QvCodec::getParam("filename"); file.isText() && file.size() > 0)
                value.asVector().append(file);
            if (const Any inner = input.QvCodec::getParam("inputFiles"); inner.isVector())
                for (const Any& file : inner.asVector()) value.asVector().append(file);
        }
    } else if (is("filesize")) {
        long long bytes = 0;
        for (std::size_t i = 0; shown && i < shown->inputs().size(); ++i)
            if (const Any size = shown->inputs()[i].decoder().QvCodec::getParam("filesize"); size.isInt())
                bytes += size.toInt64();
        value.invalidate();
        if (shown) value = Any(bytes);
    } else if (!qvGetParamRow<Settings>(rows, settings_, name, value)) {
        BaseDecodePipe::getParam(name, value);
    }
}

int MVMetaDec::refuse(int code, const std::string& reason) {
    dropStreams();
    inputFailure_ = reason;
    return setError(code, "%s", reason.c_str());
}

int MVMetaDec::readSetup(QvViewSetup& setup, bool& isNone) {
    isNone = false;
    const std::string fault =
        source_.filename.isValid() ? setup.load(source_.filename, &isNone) : setup.restore(source_.state);
    if (!fault.empty()) return refuse(QvStatus::failed, fault);
    if (source_.filename.isValid()) setup.store(source_.state);
    if (!settings_.layout.empty()) QvViewSetup::findLayout(settings_.layout, setup.layout);
    return QvStatus::ok;
}

int MVMetaDec::open() {
    if (getState() == stateOpen) close();
    inputFailure_.clear();
    if (!source_.filename.isValid() && source_.state.empty())
        return refuse(QvStatus::illegalState, "open: open parameters not defined");
    const InputNesting nesting(source_.filename);
    const auto failed = [this](int code) {
        InputNesting::noteFailure(inputFailure_);
        return code;
    };
    if (!nesting.fault().empty()) return failed(refuse(QvStatus::failed, nesting.fault()));
    QvViewSetup setup;
    bool isNone = false;
    if (const int result = readSetup(setup, isNone); result != QvStatus::ok)
        return isNone ? result : failed(result);

    const Any params = source_.openParams;
    MVStream& stream = *addStream(std::make_unique<MVStream>());
    if (const std::string fault = stream.prepare(setup, source_.openParams.empty() ? nullptr : &params);
        !fault.empty())
        return failed(refuse(QvStatus::failed, fault));
    addSounds(stream);
    return QvDecodePipe::open();
}

void MVMetaDec::addSounds(MVStream& picture) {
    QvDecodePipe& input = picture.inputs().front().decoder();
    for (int i = 0; i < input.nrAudioStreams(); ++i) addStream(std::make_unique<ViewSound>(input, i));
}

MVStream* MVMetaDec::picture() const {
    return getState() == stateOpen ? static_cast<MVStream*>(findStream(qvVideoStream, 0)) : nullptr;
}

int MVMetaDec::readFrame(int stream) {
    checkState(stateOpen, "readFrame");
    checkStream(qvVideoStream, stream, "readFrame");
    MVStream& shown = *picture();
    const int result = shown.read();
    if (result == QvStatus::ok || result == QvStatus::endOfStream) return result;
    return setError(result, "%s", shown.failure().c_str());
}

int MVMetaDec::seekToFrame(long long frame, int stream) {
    checkState(stateOpen, "seekToFrame");
    checkStream(qvVideoStream, stream, "seekToFrame");
    MVStream& shown = *picture();
    const int result = shown.seek(frame);
    if (result == QvStatus::ok || result == QvStatus::endOfStream) return result;
    return setError(result, "%s", shown.failure().c_str());
}

QvFrame* MVMetaDec::getFramePtr(int stream) {
    checkState(stateOpen, "getFramePtr");
    checkStream(qvVideoStream, stream, "getFramePtr");
    return picture()->current();
}

QvDecodePipe& MVMetaDec::soundInput(const char* method, int stream) const {
    checkState(stateOpen, method);
    checkStream(qvAudioStream, stream, method);
    return picture()->inputs().front().decoder();
}

int MVMetaDec::readSamples(int count, int stream) {
    QvDecodePipe& input = soundInput("readSamples", stream);
    const int result = input.readSamples(count, stream);
    if (result < 0 && result != QvStatus::endOfStream) setError(result, "%s", input.errorDesc());
    return result;
}

int MVMetaDec::seekToSample(long long sample, int stream) {
    QvDecodePipe& input = soundInput("seekToSample", stream);
    const int result = input.seekToSample(sample, stream);
    if (result < 0 && result != QvStatus::endOfStream) setError(result, "%s", input.errorDesc());
    return result;
}

QvPcm* MVMetaDec::getAudioPtr(int stream) { return soundInput("getAudioPtr", stream).getAudioPtr(stream); }

QvCodec* newMvmetadec() { return new MVMetaDec; }
