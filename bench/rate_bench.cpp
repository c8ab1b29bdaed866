// What it costs to change the rate of pictures of 1920 x 1080, as ratios to copies of whole frames.
#include <cstring>
#include <memory>
#include <vector>

#include "bench/ratio.h"
#include "builtin/video/frames/qvbobber.h"
#include "builtin/video/frames/qvframerateconvert.h"

namespace {

QvFrame picture(unsigned fourcc, const QvFramerate& rate) {
    QvFrame frame;
    frame.init(fourcc, 1920, 1080);
    for (int i = 0; i < frame.total_bytes(); ++i)
        frame.plane()[i] = static_cast<unsigned char>(i * 7 + i / 4096);
    frame.framerate = rate;
    return frame;
}

// Gives four frames and fetches all that they make.
void giveFour(QvVideoFilter& filter, QvFrame& frame, int& number) {
    for (int i = 0; i < 4; ++i) {
        frame.frameNr = number++;
        filter.write(frame);
        for (; filter.ready() > 0; filter.next()) benchmark::DoNotOptimize(filter.frame());
    }
}

struct Copies {
    explicit Copies(const QvFrame& frame)
        : bytes_(static_cast<std::size_t>(frame.total_bytes())), to_(bytes_) {
        from_ = frame.plane();
    }
    void run(int halves) {
        for (; halves > 1; halves -= 2) std::memcpy(to_.data(), from_, bytes_);
        if (halves > 0) std::memcpy(to_.data(), from_, bytes_ / 2);
        benchmark::ClobberMemory();
    }

  private:
    std::size_t bytes_;
    std::vector<unsigned char> to_;
    const unsigned char* from_ = nullptr;
};

void convert(QvRatioBench& bench, const char* name, double in, double out, int interlace, int pulldown,
             int copiedHalves) {
    QvFramerateConvert converter;
    converter.init();
    converter.setParam("inFramerate", in);
    converter.setParam("outFramerate", out);
    converter.setParam("interlace", interlace);
    converter.setParam("pulldown", pulldown);
    converter.open();
    QvFrame frame = picture(QvFourcc::I420, QvFramerate(in));
    Copies copies(frame);
    int number = 0;
    bench.compare(
        name, interlace ? 1.5 : 1.2, [&] { giveFour(converter, frame, number); },
        [&] { copies.run(copiedHalves); });
}

void bob(QvRatioBench& bench, const char* name, unsigned fourcc, int alpha, double aim) {
    QvBobber bobber;
    bobber.init();
    bobber.setParam("alpha", alpha);
    bobber.open();
    QvFrame frame = picture(fourcc, QvFramerate::f50i());
    Copies copies(frame);
    int number = 0;
    bench.compare(
        name, aim, [&] { giveFour(bobber, frame, number); }, [&] { copies.run(16); });
}

}  // namespace

int main() {
    QvRatioBench bench("rates, four frames of 1920 x 1080 : the copies that their results need");
    convert(bench, "25 to 50 : 4 copies", 25, 50, 0, 0, 8);
    convert(bench, "50 to 25 : 2 copies", 50, 25, 0, 0, 4);
    convert(bench, "50p to 25i : 2 copies", 50, 25, 1, 0, 4);
    convert(bench, "pulldown : 5 copies", 24, 30, 0, 1, 10);
    bob(bench, "bob I420, interpolated : 8 copies", QvFourcc::I420, 0, 3);
    bob(bench, "bob I420 : 8 copies", QvFourcc::I420, 255, 4);
    bob(bench, "bob v210 : 8 copies", QvFourcc::v210, 255, 4);
    bob(bench, "bob Y216 : 8 copies", QvFourcc::Y216, 255, 4);
}
