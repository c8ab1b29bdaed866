#include "builtin/decoders/mix/aumixdec.h"

#include <climits>
#include <cstring>

#include "builtin/creators.h"
#include "builtin/decoders/mix/interleave.h"
#include "builtin/shared/inputnesting.h"
#include "core/arch/qvassert.h"
#include "core/compose/qvmetafile.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/engine/status.h"
#include "core/measure/qvgeometry.h"

namespace {

constexpr int notReadable = -15;  // as QvMetafile::open says

constexpr QvParamRow<AudioMixDec::Settings> rows[] = {
    {"targetSamplerate", &AudioMixDec::Settings::targetSamplerate, qvParamWriteOnly, 0, INT_MAX,
     "samplerate of the mix", "Hz", "0: the highest of all inputs"},
    {.name = "metaState", .flags = qvParamByHand, .help = "the set-up of the mix", .type = Any::Dict},
    {.name = "openParameters",
     .flags = qvParamByHand,
     .help = "with which the inputs are opened",
     .type = Any::Dict},
    {.name = "filesize",
     .flags = qvParamReadOnly | qvParamByHand,
     .unit = "bytes",
     .help = "all inputs together",
     .type = Any::Int64},
    {.name = "inputFailure",
     .flags = qvParamReadOnly | qvParamByHand,
     .help = "why an input can't be read",
     .type = Any::String},
};
static_assert(qvParamTableOk<AudioMixDec::Settings>(rows));

std::string shown(const Any& text) { return text.toString().asString(""); }

}  // namespace

AudioMixDec::AudioMixDec(const QvModule* module) : BaseDecodePipe(module) {}

AudioMixDec::~AudioMixDec() = default;

int AudioMixDec::setParam(const char* name, const Any& value) {
    if (std::strcmp(name, "filename") == 0) {
        _traceParam(name, value);
        if (!value.isText()) {
            setError(QvStatus::invalidStructure, "Invalid value type for 'filename'");
            QV_FAIL(errorDesc());
        }
        filename_ = value;
        metaState_.clear();
        return QvStatus::ok;
    }
    if (std::strcmp(name, "metaState") == 0) {
        _traceParam(name, value);
        if (!value.isDict())
            return setError(QvStatus::invalidStructure, "Invalid value type for 'metaState'");
        metaState_ = value.asDict();
        if (!metaState_.empty()) filename_.invalidate();
        return QvStatus::ok;
    }
    if (std::strcmp(name, "openParameters") == 0 || std::strcmp(name, "settings") == 0) {
        _traceParam(name, value);
        if (!value.isDict()) return QvStatus::invalidParam;
        inputParams_ = value.asDict();
        return QvStatus::ok;
    }
    if (auto result = _setRow<Settings>(rows, settings_, name, value)) return *result;
    return BaseDecodePipe::setParam(name, value);
}

void AudioMixDec::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "filename") == 0) {
        value = filename_;
    } else if (std::strcmp(name, "metaState") == 0) {
        value = metaState_;
    } else if (std::strcmp(name, "filesize") == 0) {
        value.invalidate();
        if (getState() == stateOpen) getStreamParam(qvAudioStream, 0, "filesize", value);
    } else if (std::strcmp(name, "store") == 0) {
        if (!inputParams_.empty()) value = AnyDict("settings", inputParams_);
    } else if (std::strcmp(name, "inputFailure") == 0) {
        value = inputFailure_.c_str();
    } else if (!qvGetParamRow<Settings>(rows, settings_, name, value)) {
        BaseDecodePipe::getParam(name, value);
    }
}

// The set-up of the file becomes the state.
int AudioMixDec::loadSetup() {
    inputFailure_ = QvMetafile::check(filename_);
    QvAudioMixDecSetup setup;
    int result = notReadable;
    if (inputFailure_.empty()) {
        result = setup.load(filename_);
        if (result != QvStatus::ok) inputFailure_ = "it holds no mix of sounds";
    } else {
        // Loading it might end in an assertion.
        qv_log()->error("[audiomixdec]Failed to open %s, %s", shown(filename_).c_str(),
                        inputFailure_.c_str());
    }
    AnyDict state;
    setup.store(state);
    if (result == QvStatus::ok) {
        inputFailure_ = QvAudioMixDecSetup::check(state);
        if (!inputFailure_.empty()) result = QvStatus::failed;
    }
    if (result != QvStatus::ok)
        return setError(result, "[audiomixdec]Failed to open %s", shown(filename_).c_str());
    metaState_ = std::move(state);
    return QvStatus::ok;
}

int AudioMixDec::open() {
    if (getState() == stateOpen) close();
    inputFailure_.clear();
    if (!filename_.isValid() && metaState_.empty()) {
        setError(QvStatus::illegalState, "open: open parameters not defined");
        QV_FAIL(errorDesc());
    }
    const InputNesting nesting(filename_);
    const auto failed = [this](int code) {
        InputNesting::noteFailure(inputFailure_);
        return code;
    };
    if (!nesting.fault().empty()) {
        inputFailure_ = nesting.fault();
        return failed(setError(QvStatus::failed, "[audiomixdec]Failed to open %s", shown(filename_).c_str()));
    }
    if (filename_.isValid())
        if (const int result = loadSetup(); result != QvStatus::ok) return failed(result);

    auto stream = std::make_unique<Interleave>();
    int result = stream->setup.restore(metaState_);
    if (result == QvStatus::ok) result = stream->prepare(settings_.targetSamplerate, inputParams_);
    inputFailure_ = stream->inputFailure();
    if (result != QvStatus::ok)
        return failed(setError(
            result, "%s",
            stream->error().empty() ? "'metaState' is no set-up of a mix" : stream->error().c_str()));
    addStream(std::move(stream));
    return QvDecodePipe::open();
}

Interleave& AudioMixDec::mixed(const char* method, int stream) const {
    checkState(stateOpen, method);
    checkStream(qvAudioStream, stream, method);
    return static_cast<Interleave&>(*findStream(qvAudioStream, stream));
}

int AudioMixDec::readSamples(int count, int stream) { return mixed("readSamples", stream).read(count); }

int AudioMixDec::seekToSample(long long sample, int stream) {
    return mixed("seekToSample", stream).seek(sample);
}

QvPcm* AudioMixDec::getAudioPtr(int stream) { return mixed("getAudioPtr", stream).pcm.get(); }

QvCodec* newAumixdec() { return new AudioMixDec; }
