// Parameters of the pipe: its own, those of its members by prefix, and those for all.
#include <cstdlib>
#include <cstring>
#include <optional>
#include <string_view>

#include "builtin/pipes/encodepipe2.h"
#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/measure/qvgeometry.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"

namespace {

using std::string_view;

// "video12/width" is member "video" 12 and "width"; without a slash the rest is null.
struct Address {
    string_view member;
    int nr = 0;
    const char* rest = nullptr;
};

std::optional<Address> parseAddress(const char* name) {
    const char* slash = std::strchr(name, '/');
    const string_view head = slash ? string_view(name, static_cast<size_t>(slash - name)) : string_view(name);
    Address address{head, 0, slash ? slash + 1 : nullptr};
    if (head == "muxer" || head == "sink") return slash ? std::optional(address) : std::nullopt;
    for (const string_view kind : {string_view("video"), string_view("audio")}) {
        if (!head.starts_with(kind) || head.size() == kind.size() || head.size() > kind.size() + 4) continue;
        address.member = kind;
        for (const char digit : head.substr(kind.size())) {
            if (digit < '0' || digit > '9') return std::nullopt;
            address.nr = address.nr * 10 + (digit - '0');
        }
        return address;
    }
    return std::nullopt;
}

constexpr QvParamRow<EncodePipe2> described[] = {
    {.name = "filename",
     .flags = qvParamByHand,
     .help = "the output; the multiplexer may make several names of it",
     .type = Any::String},
    {.name = "sinkName", .flags = qvParamByHand, .help = "module of the sink", .type = Any::String},
    {.name = "twoPass", .flags = qvParamByHand, .help = "for the video encoders", .type = Any::Int32},
    {.name = "pal",
     .flags = qvParamByHand,
     .help = "for the video encoders and the multiplexer",
     .type = Any::Int32},
    {.name = "adjustCodecToMuxer",
     .flags = qvParamByHand | qvParamWriteOnly,
     .help = "1: encoders follow what the multiplexer demands",
     .type = Any::Int32},
    {.name = "video0/...",
     .flags = qvParamByHand,
     .help = "a parameter of a member: video0, audio1, muxer or sink, a slash and its name"},
    {.name = "extension", .flags = qvParamByHand | qvParamReadOnly, .type = Any::String},
    {.name = "filesWritten", .flags = qvParamByHand | qvParamReadOnly, .type = Any::Vector},
};
static_assert(qvParamTableOk<EncodePipe2>(described));

}  // namespace

struct EncodePipeParams {
    using Pipe = EncodePipe2;

    static QvCodec* member(const Pipe& pipe, const Address& address) {
        if (address.member == "muxer") return pipe.muxer_.get();
        if (address.member == "sink") return pipe.sink_.get();
        return pipe.encoder(address.member == "video" ? qvVideoStream : qvAudioStream, address.nr);
    }

    // --- What is set

    static int preset(Pipe& pipe, const Any& value) {
        qv_dbg()->warning("EncodePipe: 'preset' parameter DEPRECATED, Use QvEncodePipe::applyPreset()");
        if (value.isInt32()) return pipe.applyPreset(value.asInt32(), 0);
        if (value.isDict()) return pipe.applyPreset(QvPreset(value.asDict()), 0);
        return pipe.setError(QvStatus::invalidArgument, "Invalid value type for 'preset'");
    }
    static int filename(Pipe& pipe, const Any& value) {
        pipe.filename_ = value;
        int result = pipe.sink_ ? pipe.forward(pipe.sink_.get(), "filename", value) : 0;
        return result | pipe.forwardToMuxer("filename", value);
    }
    static int muxerName(Pipe& pipe, const Any& value) {
        qv_dbg()->warning("EncodePipe: 'muxerName' parameter DEPRECATED, use QvEncodePipe::setMuxer()");
        return value.isString()
                   ? pipe.setMuxer(value.asString())
                   : pipe.setError(QvStatus::invalidArgument, "Invalid value type for 'muxerName'");
    }
    static int sinkName(Pipe& pipe, const Any& value) {
        return value.isString()
                   ? pipe.setSink(value.asString())
                   : pipe.setError(QvStatus::invalidArgument, "Invalid value type for 'sinkName'");
    }
    static int adjust(Pipe& pipe, const Any& value) {
        pipe.adjustCodecToMuxer_ = value.isTrue();
        return QvStatus::ok;
    }
    static int toVideo(Pipe& pipe, const char* name, const Any& value) {
        return pipe.forwardToEncoders(qvVideoStream, name, value);
    }
    static int toVideoAndMuxer(Pipe& pipe, const char* name, const Any& value) {
        return toVideo(pipe, name, value) | pipe.forwardToMuxer(name, value);
    }
    static int toAll(Pipe& pipe, const char* name, const Any& value) {
        return pipe.forwardToEncoders(qvAllStreams, name, value) | pipe.forwardToMuxer(name, value);
    }
    static int switchToBuiltin(Pipe& pipe, const Any& value) {
        const int profile = value.isInt() ? value.toInt32() : QvProfile::notSet;
        QV_ASSERT_MSG(profile != QvProfile::none, "switchToBuiltin: switch to none not supported yet");
        const int index = qvPresetMgr()->findByProfile(profile);
        QV_ASSERT_MSG(index >= 0, "switchToBuiltin: profile not found");
        return take(pipe, qvPresetMgr()->builtinPreset(index), "switchToBuiltin: mustn't change profile");
    }
    static int switchToUser(Pipe& pipe, const Any& value) {
        QV_ASSERT_MSG(value.isDict(), "switchToUser: profile not found");
        const QvPreset preset(value.asDict());
        QV_ASSERT_MSG(preset.profile() != QvProfile::none, "switchToUser: switch to none not supported yet");
        return take(pipe, preset, "switchToUser: mustn't change profile");
    }
    static int take(Pipe& pipe, const QvPreset& preset, const char* otherProfile) {
        QV_ASSERT_MSG(preset.profile() == pipe.preset_.profile(), otherProfile);
        pipe.preset_ = preset;
        pipe.rebuildAllowed();
        return QvStatus::ok;
    }

    struct Setter {
        const char* name;
        int (*set)(Pipe&, const Any&);
        int (*spread)(Pipe&, const char*, const Any&);
        const char* obsolete;  // the text of the assertion
    };
    static constexpr Setter setters[] = {
        {"preset", preset, nullptr, nullptr},
        {"userProfile", nullptr, nullptr,
         "EncodePipe: 'userProfile' parameter OBSOLETE, use QvEncodePipe::applyPreset()"},
        {"filename", filename, nullptr, nullptr},
        {"twoPass", nullptr, toVideo, nullptr},
        {"video", nullptr, nullptr, "EncodePipe: 'video' parameter OBSOLETE, use QvEncodePipe::setCodec()"},
        {"audio", nullptr, nullptr, "EncodePipe: 'audio' parameter OBSOLETE, use QvEncodePipe::setCodec()"},
        {"adjustCodecToMuxer", adjust, nullptr, nullptr},
        {"pal", nullptr, toVideoAndMuxer, nullptr},
        {"muxerName", muxerName, nullptr, nullptr},
        {"sinkName", sinkName, nullptr, nullptr},
        {"_switchToBuiltin", switchToBuiltin, nullptr, nullptr},
        {"_switchToUser", switchToUser, nullptr, nullptr},
    };

    // --- What is answered

    static void ofEncoder(const Pipe& pipe, int type, const char* name, Any& value) {
        if (const auto* encoder = pipe.encoder(type, 0)) encoder->getParam(name, value);
    }
    static void pal(const Pipe& pipe, Any& value) {
        ofEncoder(pipe, qvVideoStream, "pal", value);
        if (!value.isValid() && pipe.muxer_) pipe.muxer_->getParam("pal", value);
    }
    static void estimate(const Pipe& pipe, Any& value) {
        if (pipe.muxer_) pipe.muxer_->getParam("estimateSecKb", value);
        if (value.isValid()) return;
        double sum = 0;
        for (const auto& stream : pipe.streams_) {
            if (!stream->encoder) continue;
            const Any part = static_cast<const QvCodec*>(stream->encoder)->getParam("estimateSecKb");
            if (part.isInt() || part.isFloat()) sum += part.toDouble();
        }
        value = sum;
    }
    static void filename(const Pipe& pipe, Any& value) {
        if (pipe.sink_) pipe.sink_->getParam("filename", value);
        if (!value.isValid()) value = pipe.filename_;
    }
    static void filesWritten(const Pipe& pipe, Any& value) {
        if (pipe.muxer_) pipe.muxer_->getParam("filesWritten", value);
        if (!value.isValid() && pipe.sink_) pipe.sink_->getParam("filesWritten", value);
        if (!value.isValid()) value = AnyVector();
    }
    static void extension(const Pipe& pipe, Any& value) {
        if (pipe.muxer_) pipe.muxer_->getParam("extension", value);
        if (!value.isValid()) value = "000";
    }
    static void srPossible(const Pipe& pipe, Any& value) {
        Any muxer;
        Any encoder;
        if (pipe.muxer_) pipe.muxer_->getParam("srPossible", muxer);
        ofEncoder(pipe, qvVideoStream, "srPossible", encoder);
        if (muxer.isFalse())
            qv_dbg()->info("Smart render not possible, not supported by decoder.");
        else if (encoder.isFalse())
            qv_dbg()->info("Smart render not possible, not supported by encoder.");
        value = muxer.isTrue() && encoder.isTrue() ? 1 : 0;
    }
    static void videoNecessary(const Pipe& pipe, Any& value) {
        Any needed;
        if (pipe.muxer_) pipe.muxer_->getParam("videoNecessary", needed);
        if (needed.isFalse()) {
            value = 0;
            return;
        }
        const Any text =
            Any::sprintf("Multiplexer %s requires video stream to be selected", pipe.muxer_->displayName());
        value = Any::sprintf("[%s] %s", pipe.displayName(), text.asString());
    }
    static void bitrateRange(const Pipe& pipe, Any& value) {
        Any answer;
        ofEncoder(pipe, qvVideoStream, "bitrateRange", answer);
        if (!answer.isVector()) return;
        AnyVector ranges;
        for (const auto& element : answer.asVector()) {
            if (!element.isDict()) continue;
            AnyDict range;
            range.set("type", element.asDict().get("type"));
            range.set("range", element.asDict().get("range"));
            ranges.append(range);
        }
        value = ranges;
    }
    static void nameOfFirst(const Pipe& pipe, int type, const char* param, Any& value) {
        qv_dbg()->warning("EncodePipe: '%s' parameter DEPRECATED, use audioEncoder(...)->name()", param);
        const auto* encoder = pipe.encoder(type, 0);
        value = encoder ? encoder->name() : "none";
    }
    template <int type>
    static void codecName(const Pipe& pipe, Any& value) {
        nameOfFirst(pipe, type, type == qvVideoStream ? "videoName" : "audioName", value);
    }

    struct Getter {
        const char* name;
        void (*get)(const Pipe&, Any&);
        const char* obsolete;  // the text of the assertion
    };
    static constexpr Getter getters[] = {
        {"preset",
         [](const Pipe& p, Any& v) {
             qv_dbg()->warning(
                 "EncodePipe: 'preset' parameter DEPRECATED, use QvEncodePipe::activePreset().");
             v = static_cast<const AnyDict&>(p.preset_);
         },
         nullptr},
        {"presets",
         [](const Pipe&, Any& v) {
             qv_dbg()->warning(
                 "EncodePipe: 'presets' parameter DEPRECATED, use QvPresetMgr::builtinPresets()");
             v = static_cast<const AnyVector&>(qvPresetMgr()->builtinPresets());
         },
         nullptr},
        {"srPossible", srPossible, nullptr},
        {"profile", [](const Pipe& p, Any& v) { v = p.preset_.profile(); }, nullptr},
        {"origProfile",
         [](const Pipe& p, Any& v) {
             qv_dbg()->warning(
                 "EncodePipe: 'origProfile' parameter DEPRECATED, use activePreset()->profile()");
             v = p.preset_.profile();
         },
         nullptr},
        {"pal", pal, nullptr},
        {"twoPass", [](const Pipe& p, Any& v) { ofEncoder(p, qvVideoStream, "twoPass", v); }, nullptr},
        {"twoPassPossible", [](const Pipe& p, Any& v) { ofEncoder(p, qvVideoStream, "twoPassPossible", v); },
         nullptr},
        {"enableSetSize", [](const Pipe& p, Any& v) { ofEncoder(p, qvVideoStream, "enableSetSize", v); },
         nullptr},
        {"availableCodecs", [](const Pipe& p, Any& v) { v = p.allowed_; }, nullptr},
        {"estimateSecKb", estimate, nullptr},
        {"filename", filename, nullptr},
        {"filesWritten", filesWritten, nullptr},
        {"extension", extension, nullptr},
        {"muxerName", [](const Pipe& p, Any& v) { v = p.muxer_ ? p.muxer_->name() : "none"; }, nullptr},
        {"sinkName", [](const Pipe& p, Any& v) { v = p.sinkName_; }, nullptr},
        {"videoName", codecName<qvVideoStream>, nullptr},
        {"audioName", codecName<qvAudioStream>, nullptr},
        {"videoAvailable", nullptr, "EncodePipe: 'videoAvailable' parameter OBSOLETE."},
        {"audioAvailable", nullptr, "EncodePipe: 'audioAvailable' parameter OBSOLETE."},
        {"videoNecessary", videoNecessary, nullptr},
        {"bitrateRange", bitrateRange, nullptr},
    };
};

int EncodePipe2::setParam(const char* name, const Any& value) {
    _traceParam(name, value);
    for (const auto& row : EncodePipeParams::setters) {
        if (std::strcmp(row.name, name) != 0) continue;
        if (row.obsolete) QV_FAIL(row.obsolete);
        return row.set ? row.set(*this, value) : row.spread(*this, name, value);
    }
    const auto address = parseAddress(name);
    if (!address) return EncodePipeParams::toAll(*this, name, value);
    auto* target = EncodePipeParams::member(*this, *address);
    if (!target) return _raiseInvalidParam(name);
    int result = QvStatus::ok;
    if (address->rest)
        result = target->setParam(address->rest, value);
    else
        result = value.isDict() ? target->setParamDict(value.asDict()) : _raiseInvalidParam(name);
    if (result != QvStatus::ok && target->errorCode() == result) takeError(*target, result);
    return result;
}

void EncodePipe2::getParam(const char* name, Any& value) const {
    for (const auto& row : EncodePipeParams::getters) {
        if (std::strcmp(row.name, name) != 0) continue;
        if (row.obsolete) QV_FAIL(row.obsolete);
        row.get(*this, value);
        return;
    }
    if (const auto address = parseAddress(name); address && address->rest) {
        if (const auto* target = EncodePipeParams::member(*this, *address))
            target->getParam(address->rest, value);
        return;
    }
    if (!qvGetParamRow<EncodePipe2>(described, *this, name, value)) QvEncodePipe::getParam(name, value);
}
