#include "core/job/jobdescription.h"
#include "core/measure/fourcc.h"
#include "core/transcode/batch/streamdescription_p.h"
#include "core/value/any.h"

void qvDescribeVideo(const VideoJobDescription& job, int frames, AnyDict& params) {
    const Any codec = qvFourccText(job.outFOURCC).data();
    const double rate = job.outFramerate.rate().ratio();
    const double seconds = rate > 0 ? frames / rate : 0.0;
    const double pixelAspect = job.outWidth > 0 ? job.outFrameAspect * job.outHeight / job.outWidth : 1.0;
    params.clear();
    params.set("codec", codec);
    params.set("videoCodec", codec);
    params.set("width", Any(job.outWidth));
    params.set("height", Any(job.outHeight));
    params.set("pixelAspect", Any(pixelAspect));
    params.set("frameAspect", Any(job.outFrameAspect));
    params.set("FOURCC", Any(static_cast<int>(job.outFOURCC)));
    params.set("framerate", Any(job.outFramerate));
    params.set("pal", Any(job.outFramerate.isPAL() ? 1 : 0));
    params.set("frames", Any(frames));
    params.set("duration", Any(seconds));
    params.set("vDuration", Any(seconds));
    params.set("vBitrate", Any(0.0));  // not known
    params.set("_selected", Any(1));
}

void qvDescribeAudio(const AudioJobDescription& job, long long samples, AnyDict& params) {
    const double seconds = job.outSamplerate > 0 ? static_cast<double>(samples) / job.outSamplerate : 0.0;
    params.clear();
    params.set("codec", Any("PCM"));
    params.set("audioCodec", Any("PCM"));
    params.set("samplerate", Any(job.outSamplerate));
    params.set("bytesPerSample", Any((job.outBitsPerSample + 7) / 8));
    params.set("bitsPerSample", Any(job.outBitsPerSample));
    params.set("samples", Any(samples));
    params.set("aDuration", Any(seconds));
    params.set("duration", Any(seconds));
    params.set("_selected", Any(1));
    params.set("channels", Any(job.outChannels));
}
