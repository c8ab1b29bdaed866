#include "core/arch/qvassert.h"
#include "core/engine/status.h"
#include "core/job/streamformat.h"
#include "core/media/qvbuffer.h"
#include "core/transcode/push/pushfeed_p.h"
#include "core/transcode/push/pushinput_p.h"

PushInput::~PushInput() { PushInput::close(); }

int PushInput::open() {
    int result = QvStatus::ok;
    for (const auto& params : videos_)
        if (result == QvStatus::ok) result = openVideo(params);
    for (const auto& params : audios_)
        if (result == QvStatus::ok) result = openAudio(params);
    if (result == QvStatus::ok) return BaseDecodePipe::open();
    dropStreams();
    return setError(result, "Out of memory");
}

int PushInput::openVideo(const AnyDict& params) {
    auto& stream = *addStream(std::make_unique<DPipeVideoStream>());
    stream.params = params;
    stream.frame = std::make_unique<QvFrame>();
    const VideoFormat format(params);
    return stream.frame->init(format.fourcc, format.width, format.height);
}

int PushInput::openAudio(const AnyDict& params) {
    auto& stream = *addStream(std::make_unique<DPipeAudioStream>());
    stream.params = params;
    stream.pcm = std::make_unique<QvPcm>();
    return stream.pcm->init(params.getInt32("bufferLength", 0), params.getInt32("channels", 0),
                            params.getInt32("bytesPerSample", 0), params.getInt32("samplerate", 0));
}

DPipeVideoStream& PushInput::video(int stream) const {
    checkStream(qvVideoStream, stream, "readFrame");
    return static_cast<DPipeVideoStream&>(*findStream(qvVideoStream, stream));
}

DPipeAudioStream& PushInput::audio(int stream) const {
    checkStream(qvAudioStream, stream, "readSamples");
    return static_cast<DPipeAudioStream&>(*findStream(qvAudioStream, stream));
}

QvFrame* PushInput::getFramePtr(int stream) { return video(stream).frame.get(); }

QvPcm* PushInput::getAudioPtr(int stream) { return audio(stream).pcm.get(); }

int PushInput::readFrame(int stream) { return feed_.readFrame(*video(stream).frame, stream); }

int PushInput::readSamples(int count, int stream) {
    auto& pcm = *audio(stream).pcm;
    pcm.setSamples(0);
    if (count < 1) return 0;
    if (count > pcm.size() && pcm.grow(count - pcm.size()) < 0)
        return setError(QvStatus::outOfMemory, "Out of memory");
    const int read = feed_.readSamples(pcm.ptr(0), count, stream);
    if (read > 0) {
        pcm.setSamples(read);
        pcm.setPosition(pcm.position() + read);
    }
    return read;
}
