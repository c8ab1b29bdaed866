// Captures from code: an application draws pictures and makes a tone of its own, pushes both while they come,
// and gets an uncompressed AVI file.
//
//     capture_from_code FILE.avi [SECONDS]
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <vector>

#include <qvplugcore/qvplugcore.h>

namespace {

constexpr int kWidth = 320, kHeight = 240, kSamplerate = 48000;
const QvFramerate kRate(QvRatio(30000, 1001));

// The n-th picture: a white bar that moves over grey.
void draw(QvFrame& frame, int n) {
    frame.setBlack();  // and the chroma of grey
    for (int y = 0; y < kHeight; ++y) {
        unsigned char* row = frame.plane(0) + y * frame.stride(0);
        for (int x = 0; x < kWidth; ++x)
            row[x] = static_cast<unsigned char>(x / 8 == n % (kWidth / 8) ? 235 : 96);
    }
}

// The next samples of a 440 Hz tone, in both channels.
void play(QvPcm& pcm, long long first, int count) {
    std::vector<short> values(static_cast<size_t>(count) * 2);
    for (int i = 0; i < count; ++i) {
        const double angle = 2 * 3.14159265358979 * 440 * static_cast<double>(first + i) / kSamplerate;
        values[static_cast<size_t>(2 * i)] = values[static_cast<size_t>(2 * i + 1)] =
            static_cast<short>(8000 * std::sin(angle));
    }
    pcm.setSamples(0);
    pcm.write(count, reinterpret_cast<const unsigned char*>(values.data()));
}

int fail(const char* why) {
    std::fprintf(stderr, "capture_from_code: %s\n", why);
    return 1;
}

int capture(const char* to, int frames) {
    std::unique_ptr<QvEncodePipe> output(QvEncodePipe::create());
    output->applyPreset(QvProfile::aviRaw, 0);
    output->clearStreams();
    output->addVideoStream(Any("rawvenc"));
    output->addAudioStream(Any("rawaenc"));
    output->setParam("video0", AnyDict("type", static_cast<int>(QvFourcc::I420), "width", kWidth, "height",
                                       kHeight, "framerate", kRate));
    output->setFilename(Any(to));

    QvPushEncoder push;
    push.setEncoder(output.get());
    AnyDict video("FOURCC", static_cast<int>(QvFourcc::I420), "width", kWidth, "height", kHeight, "framerate",
                  kRate);
    AnyDict audio("samplerate", kSamplerate, "channels", 2, "bitsPerSample", 16);
    if (push.addVideoStream(video, nullptr) != 0 || push.addAudioStream(audio, nullptr) != 0 ||
        push.open() != 0 || push.start() != 0)
        return fail(push.errorDesc());

    QvFrame frame;
    frame.init(QvFourcc::I420, kWidth, kHeight);
    QvPcm pcm;
    pcm.init(kSamplerate, 2, 2, kSamplerate);
    long long played = 0;
    for (int n = 0; n < frames; ++n) {
        draw(frame, n);
        const long long due = QvUtil::samplesForFrames(n + 1, kRate, kSamplerate);
        play(pcm, played, static_cast<int>(due - played));
        played = due;
        if (push.writeFrame(&frame, 0) != 0 || push.writeSamples(&pcm, 0) != 0) return fail(push.errorDesc());
        push.process();  // no faster than the output: nothing piles up
    }
    // The end: of the sound at once, of the pictures when all of them are taken.
    push.writeSamples(nullptr, 0);
    while (!push.needsVideo(0) && push.running()) push.process();
    push.writeFrame(nullptr, 0);
    const int pushed = push.close(false);
    if (output->close() != 0) return fail(output->errorDesc());
    return pushed == 0 ? 0 : fail(push.errorDesc());
}

}  // namespace

int main(int argc, char** argv) {
    const int seconds = argc > 2 ? std::atoi(argv[2]) : 2;
    if (argc < 2 || argc > 3 || seconds < 1) {
        std::fprintf(stderr, "usage: capture_from_code FILE.avi [SECONDS]\n");
        return 2;
    }
    init_wrapper(nullptr);
    const int result = capture(argv[1], seconds * 30);
    cleanup_wrapper();
    return result;
}
