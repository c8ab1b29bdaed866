#include <algorithm>
#include <cstddef>
#include <string>
#include <vector>

#include "core/arch/qvassert.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/job/streamformat.h"
#include "core/transcode/batch/segmentjoin_p.h"
#include "core/transcode/link/audio/audiomuxer.h"
#include "core/transcode/link/audio/channelmatrix_p.h"
#include "core/transcode/link/video/encodertraits_p.h"

namespace {

using Segments = std::vector<std::unique_ptr<QvInputSegment>>;

AnyDict inputParams(const QvIStream& stream) {
    AnyDict params;
    stream.decoder->getStreamParams(stream.type, stream.number, params);
    return params;
}

Any encoderParam(const QvEncodePipe& output, const char* type, int number, const char* name) {
    return output.QvCodec::getParam(Any::sprintf("%s%d/%s", type, number, name).asString());
}

VideoJobDescription videoJob(const QvEncodePipe& output, int number, const VideoFormat& in) {
    const EncoderTraits out(output, number);
    VideoJobDescription job;
    const Any rate = encoderParam(output, "video", number, "framerate");
    const bool rated = rate.isFramerate() && rate.asFramerate().rate().ratio() > 0;
    job.outFramerate = rated ? rate.asFramerate() : in.framerate;
    job.outWidth = out.width > 0 ? out.width : in.width;
    job.outHeight = out.height > 0 ? out.height : in.height;
    job.outFOURCC = out.formatFor(in.fourcc);
    job.outFrameAspect = in.frameAspect;
    job.topBlankingLines = out.topBlankingLines;
    return job;
}

AudioJobDescription audioJob(const QvEncodePipe& output, int number, const AudioFormat& in) {
    const auto given = [&](const char* name, int otherwise) {
        const int value = encoderParam(output, "audio", number, name).asInt32(0);
        return value > 0 ? value : otherwise;
    };
    AudioJobDescription job;
    job.outSamplerate = given("samplerate", in.samplerate);
    job.outChannels = given("channels", in.channels);
    job.outBitsPerSample = given("bitsPerSample", AudioFormat::defaultBits);
    return job;
}

// Whether the stream brings a map that suits the output. What a link would mix from several streams is
// refused: a segment reads one.
bool hasChannelMap(const QvIStream& stream, int channels) {
    const AnyVector* own = stream.params.audioChannelMap();
    if (!own) return false;
    const ChannelMatrix matrix(*own, stream.number);
    std::vector<int> given;
    for (int i = 0; i < stream.decoder->nrAudioStreams(); ++i)
        given.push_back(stream.decoder->getAudioParam(i, "channels").asInt32(-1));
    if (const std::string fault = matrix.fault(channels, given); !fault.empty()) {
        qv_dbg()->warning("%s", fault.c_str());
        return false;
    }
    for (const int named : matrix.streams())
        QV_ASSERT_MSG(named == stream.number, "A joined segment can't mix several streams of its file");
    return true;
}

// Which channel goes where.
void giveChannelMap(QvIStream& stream, QvEncodePipe& output, int number, int channels) {
    if (hasChannelMap(stream, channels)) return;
    AudioMuxer muxer;
    AnyVector map;
    if (muxer.init(stream.decoder, output.audioEncoder(number), channels, nullptr, stream.number) ==
        QvStatus::ok)
        muxer.store(map);
    stream.params.setAudioChannelMap(map);
}

void insert(QvBatchDecoder& joined, const QvInputSegment& segment, QvEncodePipe& output) {
    std::vector<QvIStream> copies;
    for (std::size_t i = 0; i < segment.streams.size(); ++i) {
        if (!segment.streams[i]->decoder || segment.streams[i]->type == qvSubpicStream) continue;
        QvIStream& copy = copies.emplace_back(*segment.streams[i]);
        if (copy.type != qvAudioStream) continue;
        const int number = qvOutputNumber(output, copy, i);
        const int channels = encoderParam(output, "audio", number, "channels").asInt32(0);
        giveChannelMap(copy, output, number,
                       channels > 0 ? channels : AudioFormat(inputParams(copy)).channels);
    }
    QvBatchDecoder::InputSegment all;
    for (QvIStream& copy : copies) all.streams.append(&copy);
    QV_ASSERT_MSG(joined.insertSegment(all, -1) == QvStatus::ok, joined.errorDesc());
}

}  // namespace

int qvOutputNumber(QvEncodePipe& output, const QvIStream& stream, std::size_t place) {
    const int index = static_cast<int>(place);
    QV_ASSERT_MSG(index < output.nrStreams() && output.streamAt(index)->type == stream.type,
                  "BatchTask.restore: invalid stream ordering");
    return output.streamNr(output.streamAt(index));
}

std::unique_ptr<QvBatchDecoder> qvJoinSegments(const Segments& segments, QvEncodePipe* output) {
    QV_ASSERT_MSG(segments.size() >= 2, "Why me d00d!?");
    if (!output) {
        qv_dbg()->error("[Task] [BatchTask] Creating batch decoder without encoder params not yet supported");
        return nullptr;
    }
    const auto first = std::find_if(segments.begin(), segments.end(), [](const auto& segment) {
        return segment->status == QvInputSegment::opened && !segment->streams.empty();
    });
    QV_ASSERT(first != segments.end());
    auto joined = std::make_unique<QvBatchDecoder>();
    for (std::size_t i = 0; i < (*first)->streams.size(); ++i) {
        const QvIStream& stream = *(*first)->streams[i];
        if (!stream.decoder) continue;
        const int number = qvOutputNumber(*output, stream, i);
        if (stream.type == qvVideoStream)
            joined->addOutputVideoStream(videoJob(*output, number, VideoFormat(inputParams(stream))));
        else if (stream.type == qvAudioStream)
            joined->addOutputAudioStream(audioJob(*output, number, AudioFormat(inputParams(stream))));
    }
    for (std::size_t i = 0; i < segments.size(); ++i) {
        if (segments[i]->status != QvInputSegment::opened) continue;
        if (segments[i]->streams.empty())
            qv_dbg()->warning("[Task] *** Skipping segment %s", std::to_string(i).c_str());
        else
            insert(*joined, *segments[i], *output);
    }
    return joined;
}
