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
    const bool isSettings = std::strcmp(name, "settings") == 0;  // of a stored state
    std::string fault;
    if (const auto result = source_.set(isSettings ? "openParameters" : name, value, fault)) {
        _traceParam(name, value);
        if (!fault.empty()) setError(*result, "%s", fault.c_str());
        if (!fault.empty() && std::strcmp(name, "filename") == 0) QV_FAIL(errorDesc());
        return *result;
    }
    if (auto result = _setRow<Settings>(rows, settings_, name, value)) return *result;
    return BaseDecodePipe::setParam(name, value);
}

void AudioMixDec::getParam(const char* name, Any& value) const {
    if (source_.get(name, value)) return;
    if (std::strcmp(name, "filesize") == 0) {
        value.invalidate();
        if (getState() == stateOpen) getStreamParam(qvAudioStream, 0, "filesize", value);
    } else if (std::strcmp(name, "store") == 0) {
        if (!source_.openParams.empty()) value = AnyDict("settings", source_.openParams);
    } else if (std::strcmp(name, "inputFailure") == 0) {
        value = inputFailure_.c_str();
    } else if (!qvGetParamRow<Settings>(rows, settings_, name, value)) {
        BaseDecodePipe::getParam(name, value);
    }
}

// Reads the set-up from the file into source_.state.
int AudioMixDec::loadSetup() {
    inputFailure_ = QvMetafile::check(source_.filename);
    QvAudioMixDecSetup setup;
    int result = notReadable;
    if (inputFailure_.empty()) {
        result = setup.load(source_.filename);
        if (result != QvStatus::ok) inputFailure_ = "it holds no mix of sounds";
    } else {
        // A damaged file is not loaded, as that may assert.
        qv_log()->error("[audiomixdec]Failed to open %s, %s", shown(source_.filename).c_str(),
                        inputFailure_.c_str());
    }
    AnyDict state;
    setup.store(state);
    if (result == QvStatus::ok) {
        inputFailure_ = QvAudioMixDecSetup::check(state);
        if (!inputFailure_.empty()) result = QvStatus::failed;
    }
    if (result != QvStatus::ok)
        return setError(result, "[audiomixdec]Failed to open %s", shown(source_.filename).c_str());
    source_.state = std::move(state);
    return QvStatus::ok;
}

int AudioMixDec::open() {
    if (getState() == stateOpen) close();
    inputFailure_.clear();
    if (!source_.filename.isValid() && source_.state.empty()) {
        setError(QvStatus::illegalState, "open: open parameters not defined");
        QV_FAIL(errorDesc());
    }
    const InputNesting nesting(source_.filename);
    const auto failed = [this](int code) {
        InputNesting::noteFailure(inputFailure_);
        return code;
    };
    if (!nesting.fault().empty()) {
        inputFailure_ = nesting.fault();
        return failed(
            setError(QvStatus::failed, "[audiomixdec]Failed to open %s", shown(source_.filename).c_str()));
    }
    if (source_.filename.isValid())
        if (const int result = loadSetup(); result != QvStatus::ok) return failed(result);

    auto stream = std::make_unique<Interleave>();
    int result = stream->setup.restore(source_.state);
    if (result == QvStatus::ok) result = stream->prepare(settings_.targetSamplerate, source_.openParams);
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
