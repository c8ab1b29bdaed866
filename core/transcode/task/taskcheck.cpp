#include "core/transcode/task/taskcheck_p.h"

#include <iterator>
#include <string>
#include <string_view>

#include "core/arch/qvassert.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/encode/qvencoder.h"
#include "core/encode/qvmuxer.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/moduletraits_p.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/preset/qvpreset.h"
#include "core/transcode/link/translink.h"

namespace {

// Profiles between these two, both excluded, are of the handheld family that needs picture and sound.
constexpr int kHandheldProfileLow = 33619968;
constexpr int kHandheldProfileHigh = 33620068;

constexpr int kDolbySmartRender = 2;

int viewsOf(const Any& value) { return value.isInt32() ? value.asInt32() : 1; }

// The answer of a decoder to "srParams" for one stream, asked with the pair of type and number.
Any smartRenderParams(const TransLink& link) {
    Any value(Pair(link.type(), link.decStreamNr()));
    link.decoder()->getParam("srParams", value);
    return value;
}

void appendLine(std::string& text, std::string_view line, const char* separator) {
    if (line.empty()) return;
    if (!text.empty()) text += separator;
    text += line;
}

// Display names of the link's active audio filters that change the sound, joined by ", ". Plain format
// converters do not count.
std::string soundFilters(const AnyDict& params) {
    std::string names;
    const AnyVector& filters = params.getDict("filters").getVector("customFilters");
    for (int i = 0; i < filters.size(); ++i) {
        if (!filters.at(i).isDict() || !filters.at(i).asDict().get("_on").isTrue()) continue;
        const std::string_view name = filters.at(i).asDict().getString("name", "");
        if (name.empty()) continue;
        const QvModule* module = qv_registry()->module(std::string(name).c_str());
        if (qvModuleTraits(name, module).convertsFormat) continue;
        appendLine(names, module ? std::string_view(module->displayName()) : name, ", ");
    }
    return names;
}

}  // namespace

TaskFault TaskCheck::streams() const {
    if (!encoder_ || links_.empty()) return {QvStatus::failed, "No connected streams / sources not defined"};
    int video = 0, audio = 0;
    for (const TransLink* link : links_) {
        video += link->type() == qvVideoStream;
        audio += link->type() == qvAudioStream;
    }
    if (QvMuxer* muxer = encoder_->getMuxer(); muxer && video == 0) {
        const Any necessary = muxer->getParam("videoNecessary");
        if (necessary.isTrue()) {
            if (necessary.isString()) return {QvStatus::failed, necessary.asString()};
            return {QvStatus::failed, std::string(muxer->displayName()) + " requires video stream"};
        }
    }
    if (const TaskFault fault = views(); fault.code != QvStatus::ok) return fault;
    if (const QvPreset* preset = encoder_->activePreset()) {
        const int profile = preset->profile();
        const bool handheld = profile > kHandheldProfileLow && profile < kHandheldProfileHigh;
        if (handheld && (video == 0 || audio == 0))
            return {QvStatus::failed, "PSP files require both video and audio streams"};
    }
    return {};
}

TaskFault TaskCheck::views() const {
    for (const TransLink* link : links_) {
        if (link->type() != qvVideoStream) continue;
        const QvVideoEncoder* encoder = encoder_->videoEncoder(link->encStreamNr());
        QV_ASSERT_MSG(encoder, "checkMultiview: video encoder is Null");
        const int given = viewsOf(link->decoder()->getVideoParam(link->decStreamNr(), "nrViews"));
        const int required = viewsOf(encoder->QvCodec::getParam("nrViews"));
        if (required > 1 && given < required)
            return {QvStatus::notEnoughViews,
                    Any::sprintf(
                        "Source contains only %d view(s), encoder requires multi-view source with %d views.",
                        given, required)
                        .asString("")};
        if (given > required)
            qv_dbg()->warning(
                "Source contains %d views and encoder requires %d, views above %d will be discarded.", given,
                required, required);
    }
    return {};
}

int TaskCheck::legal(const ProcessParams& common, AnyVector& messages) const {
    int result = QvStatus::ok;
    for (const TransLink* link : links_) {
        if (link->type() != qvAudioStream) continue;
        const QvAudioEncoder* encoder = encoder_->audioEncoder(link->encStreamNr());
        if (!encoder || qvModuleTraits(*encoder).family != CodecFamily::dolby) continue;
        const Any codec = link->decoder()->getAudioParam(link->decStreamNr(), "codec");
        if (!(codec == "Dolby")) continue;
        const int verdict = dolbyPassthrough(*link, kDolbySmartRender, common, messages);
        if (verdict == QvStatus::failed)
            result = QvStatus::notLegal;
        else if (verdict == QvStatus::warning && result == QvStatus::ok)
            result = QvStatus::warning;
    }
    return result;
}

int TaskCheck::dolbyPassthrough(const TransLink& link, int mode, const ProcessParams& common,
                                AnyVector& messages) const {
    Any params = smartRenderParams(link);
    std::string text;
    int verdict = QvStatus::ok;
    if (!params.isDict()) {
        text = "Decoder does not support smart rendering";
        verdict = params.asInt32(QvStatus::ok);  // the decoder's own answer, if it gave one
    } else {
        const AnyDict& own = link.processParams();
        const std::string filters = soundFilters(own.isSet("filters") ? own : common);
        if (!filters.empty() && mode == kDolbySmartRender) {
            text =
                "Not possible to use audio filters when both input and output audio formats are Dolby. "
                "Please remove following filters: " +
                filters + ".";
            verdict = QvStatus::failed;
        } else {
            if (!filters.empty())
                text = "Not possible to use following filters in audio SmartRender mode: " + filters;
            const QvAudioEncoder& encoder = *encoder_->audioEncoder(link.encStreamNr());
            Any answer = params;
            encoder.getParam("srPossible", answer);
            appendLine(text, encoder.errorDesc(), "\n");
            verdict = answer.isInt32() ? answer.asInt32() : QvStatus::failed;
        }
    }
    if (verdict == QvStatus::failed || verdict == QvStatus::warning) messages.append(Any(text.c_str()));
    return verdict;
}

int TaskCheck::smartRender(AnyDict* dict) const {
    AnyVector video;
    if (encoder_) {
        for (const TransLink* link : links_) {
            if (link->type() != qvVideoStream) continue;
            const QvVideoEncoder* encoder = encoder_->videoEncoder(link->encStreamNr());
            Any answer = smartRenderParams(*link);
            if (!encoder || !answer.isDict()) continue;
            encoder->getParam("srPossible", answer);
            if (answer.isTrue() && !answer.isDict()) video.append(Any(link->encStreamNr()));
        }
    }
    const int count = video.size();
    if (dict) {
        dict->set("vids", video);
        dict->set("auds", AnyVector());
        dict->set("subs", AnyVector());
    }
    return count;
}

int TaskCheck::multiPass(TPtrList<TransLink>* list) const {
    int count = 0;
    for (TransLink* link : links_) {
        if (link->type() != qvVideoStream || !encoder_) continue;
        const QvVideoEncoder* encoder = encoder_->videoEncoder(link->encStreamNr());
        if (!encoder || !encoder->QvCodec::getParam("twoPassPossible").isTrue()) continue;
        if (list) list->append(link);
        ++count;
    }
    return count;
}
