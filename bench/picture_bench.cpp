// What it costs to convert and scale pictures of 1920 x 1080 on one thread, as ratios to the libraries that
// others use for it; what a second worker gains; and the pairs of formats that cost most, as ratios to a
// memcpy of input and output.
#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include <hwy/highway.h>

#include "bench/ratio.h"
#include "builtin/kernels/formats/formats.h"
#include "core/engine/threads/qvthreadpool.h"
#include "core/filter/srscaler.h"
#include "core/measure/fourcc.h"

#ifdef QV_HAVE_LIBYUV
#include <libyuv.h>
#endif
#ifdef QV_HAVE_LIBSWSCALE
extern "C" {
#include <libswscale/swscale.h>
}
#endif
#ifdef QV_HAVE_ZIMG
#include <zimg.h>
#endif

namespace {

constexpr int width = 1920, height = 1080;

// A picture with room for any format, filled with what looks like none, but is smooth enough.
struct Image {
    unsigned fourcc;
    int w, h;
    std::vector<uint8_t> bytes;
    Image(const char (&name)[5], int imageWidth, int imageHeight)
        : fourcc(qvFourcc(name)),
          w(imageWidth),
          h(imageHeight),
          bytes(static_cast<size_t>(w) * static_cast<size_t>(h) * 4 + 64) {
        for (size_t i = 0; i < bytes.size(); ++i)
            bytes[i] = static_cast<uint8_t>((i * 7 + i / 4096 * 13) & 255);
    }
    uint8_t* at(long long offset) { return bytes.data() + offset; }
    uint8_t* luma() { return at(0); }
    uint8_t* u() { return at(1LL * w * h); }
    uint8_t* v() { return at(1LL * w * h * 5 / 4); }
};

void ours(Image& from, Image& to, unsigned flags, unsigned mode = QvScale::oneThread) {
    if (SRScaler(mode, from.fourcc, from.luma(), 0, from.w, from.h, to.fourcc, to.luma(), 0, to.w, to.h, 0,
                 flags, nullptr) != 1)
        std::puts("the conversion failed");
}

#ifdef QV_HAVE_LIBYUV
void againstLibyuv(QvRatioBench& bench) {
    Image planar("I420", width, height), pixels("BGR4", width, height), packed("YUYV", width, height);
    Image planarOut("I420", width, height), pixelsOut("BGR4", width, height);
    const int half = width / 2;
    const auto toPixels = [&] {
        libyuv::I420ToARGB(planar.luma(), width, planar.u(), half, planar.v(), half, pixelsOut.luma(),
                           width * 4, width, height);
    };
    bench.compare(
        "I420 to BGR4, nearest chroma : libyuv", 1.0, [&] { ours(planar, pixelsOut, QvScale::nearest); },
        toPixels);
    bench.compare(
        "I420 to BGR4, linear chroma : libyuv nearest", 1.0,
        [&] { ours(planar, pixelsOut, QvScale::standard); }, toPixels);
    bench.compare(
        "I420 to BGR4, linear chroma : libyuv bilinear", 1.0,
        [&] { ours(planar, pixelsOut, QvScale::standard); },
        [&] {
            libyuv::I420ToARGBMatrixFilter(planar.luma(), width, planar.u(), half, planar.v(), half,
                                           pixelsOut.luma(), width * 4, &libyuv::kYuvI601Constants, width,
                                           height, libyuv::kFilterBilinear);
        });
    const auto toPlanar = [&] {
        libyuv::ARGBToI420(pixels.luma(), width * 4, planarOut.luma(), width, planarOut.u(), half,
                           planarOut.v(), half, width, height);
    };
    bench.compare(
        "BGR4 to I420, nearest chroma : libyuv", 1.2, [&] { ours(pixels, planarOut, QvScale::nearest); },
        toPlanar);
    bench.compare(
        "BGR4 to I420, filtered chroma : libyuv", 1.2, [&] { ours(pixels, planarOut, QvScale::standard); },
        toPlanar);
    const auto unpack = [&] {
        libyuv::YUY2ToI420(packed.luma(), width * 2, planarOut.luma(), width, planarOut.u(), half,
                           planarOut.v(), half, width, height);
    };
    bench.compare(
        "YUYV to I420, nearest chroma : libyuv", 1.2, [&] { ours(packed, planarOut, QvScale::nearest); },
        unpack);
    bench.compare(
        "YUYV to I420, filtered chroma : libyuv", 1.2, [&] { ours(packed, planarOut, QvScale::standard); },
        unpack);
}
#endif

#ifdef QV_HAVE_LIBSWSCALE
class Sws {
  public:
    Sws(AVPixelFormat from, int w, int h, AVPixelFormat to, int tw, int th, int flags)
        : context_(sws_getContext(w, h, from, tw, th, to, flags, nullptr, nullptr, nullptr)), lines_(h) {}
    ~Sws() { sws_freeContext(context_); }
    Sws(const Sws&) = delete;
    Sws& operator=(const Sws&) = delete;
    void run(const uint8_t* const from[], const int strides[], uint8_t* const to[], const int toStrides[]) {
        sws_scale(context_, from, strides, 0, lines_, to, toStrides);
    }

  private:
    SwsContext* context_;
    int lines_;
};

void againstSwscale(QvRatioBench& bench) {
    Image planar("I420", width, height), packed("YUYV", width, height), pixels("BGR4", width, height);
    Image threes("BGR3", width, height), small("BGR4", 1280, 720);
    const int half = width / 2;
    Sws toPacked(AV_PIX_FMT_YUV420P, width, height, AV_PIX_FMT_YUYV422, width, height, SWS_BICUBIC);
    const uint8_t* const planes[4] = {planar.luma(), planar.u(), planar.v(), nullptr};
    const int strides[4] = {width, half, half, 0};
    uint8_t* const packedTo[4] = {packed.luma()};
    const int packedStride[4] = {width * 2};
    bench.compare(
        "I420 to YUYV : swscale", 0.25, [&] { ours(planar, packed, QvScale::standard); },
        [&] { toPacked.run(planes, strides, packedTo, packedStride); });
    Sws toThrees(AV_PIX_FMT_BGR0, width, height, AV_PIX_FMT_BGR24, width, height, SWS_BICUBIC);
    const uint8_t* const pixelPlane[4] = {pixels.luma()};
    const int pixelStride[4] = {width * 4};
    uint8_t* const threeTo[4] = {threes.luma()};
    const int threeStride[4] = {width * 3};
    bench.compare(
        "BGR4 to BGR3 : swscale", 0.5, [&] { ours(pixels, threes, QvScale::standard); },
        [&] { toThrees.run(pixelPlane, pixelStride, threeTo, threeStride); });
    Sws down(AV_PIX_FMT_BGR0, width, height, AV_PIX_FMT_BGR0, 1280, 720, SWS_BICUBIC);
    uint8_t* const smallTo[4] = {small.luma()};
    const int smallStride[4] = {1280 * 4};
    bench.compare(
        "BGR4 1080 to 720, cubic : swscale bicubic", 0.3, [&] { ours(pixels, small, QvScale::standard); },
        [&] { down.run(pixelPlane, pixelStride, smallTo, smallStride); });
}
#endif

#ifdef QV_HAVE_ZIMG
// Planes on cache lines, as this library wants them.
class Zimg {
  public:
    Zimg(int w, int h, int tw, int th, bool words, zimg_resample_filter_e filter) {
        zimg_image_format from, to;
        describe(from, w, h, false);
        describe(to, tw, th, words);
        zimg_graph_builder_params params;
        zimg_graph_builder_params_default(&params, ZIMG_API_VERSION);
        params.resample_filter = params.resample_filter_uv = filter;
        params.dither_type = ZIMG_DITHER_NONE;
        graph_ = zimg_filter_graph_build(&from, &to, &params);
        size_t bytes = 0;
        zimg_filter_graph_get_tmp_size(graph_, &bytes);
        temporary_ = allocate(bytes);
        source_ = makeBuffer(w, h, 1, sourceMemory_);
        target_ = makeBuffer(tw, th, words ? 2 : 1, targetMemory_);
    }
    ~Zimg() { zimg_filter_graph_free(graph_); }
    Zimg(const Zimg&) = delete;
    Zimg& operator=(const Zimg&) = delete;

    void run() {
        zimg_image_buffer_const from = {ZIMG_API_VERSION, {}};
        for (int p = 0; p < 3; ++p)
            from.plane[p] = {source_.plane[p].data, source_.plane[p].stride, source_.plane[p].mask};
        zimg_filter_graph_process(graph_, &from, &target_, temporary_.get(), nullptr, nullptr, nullptr,
                                  nullptr);
    }

  private:
    struct Free {
        void operator()(uint8_t* memory) const { std::free(memory); }
    };
    using Memory = std::unique_ptr<uint8_t, Free>;
    static Memory allocate(size_t bytes) {
        return Memory(static_cast<uint8_t*>(std::aligned_alloc(64, (bytes + 127) & ~size_t{63})));
    }

    static void describe(zimg_image_format& format, int w, int h, bool words) {
        zimg_image_format_default(&format, ZIMG_API_VERSION);
        format.width = static_cast<unsigned>(w);
        format.height = static_cast<unsigned>(h);
        format.pixel_type = words ? ZIMG_PIXEL_WORD : ZIMG_PIXEL_BYTE;
        format.depth = words ? 16 : 8;
        format.subsample_w = format.subsample_h = 1;
        format.color_family = ZIMG_COLOR_YUV;
    }

    static zimg_image_buffer makeBuffer(int w, int h, int bytes, Memory memory[3]) {
        zimg_image_buffer buffer = {ZIMG_API_VERSION, {}};
        for (int p = 0; p < 3; ++p) {
            const int stride = ((p ? w / 2 : w) * bytes + 63) & ~63, lines = p ? h / 2 : h;
            const auto size = static_cast<size_t>(stride) * static_cast<size_t>(lines);
            memory[p] = allocate(size);
            for (size_t i = 0; i < size; ++i)
                memory[p].get()[i] = static_cast<uint8_t>(i * 7 + i / 4096 * 13);
            buffer.plane[p] = {memory[p].get(), stride, ZIMG_BUFFER_MAX};
        }
        return buffer;
    }

    zimg_filter_graph* graph_ = nullptr;
    Memory temporary_, sourceMemory_[3], targetMemory_[3];
    zimg_image_buffer source_{}, target_{};
};

void againstZimg(QvRatioBench& bench) {
    Image planar("I420", width, height), words("W016", width, height), small("I420", 1280, 720),
        large("I420", 3840, 2160);
    Zimg widen(width, height, width, height, true, ZIMG_RESIZE_BICUBIC);
    bench.compare(
        "I420 to W016 : zimg", 1.0, [&] { ours(planar, words, QvScale::standard); }, [&] { widen.run(); });
    Zimg cubic(width, height, 1280, 720, false, ZIMG_RESIZE_BICUBIC);
    bench.compare(
        "I420 1080 to 720, cubic : zimg bicubic", 1.0, [&] { ours(planar, small, QvScale::standard); },
        [&] { cubic.run(); });
    Zimg lanczos(width, height, 1280, 720, false, ZIMG_RESIZE_LANCZOS);
    bench.compare(
        "I420 1080 to 720, eight taps : zimg lanczos", 1.0, [&] { ours(planar, small, QvScale::high); },
        [&] { lanczos.run(); });
    Zimg enlarge(width, height, 3840, 2160, false, ZIMG_RESIZE_BICUBIC);
    bench.compare(
        "I420 1080 to 2160, cubic : zimg bicubic", 1.0, [&] { ours(planar, large, QvScale::standard); },
        [&] { enlarge.run(); });
}
#endif

void workers(QvRatioBench& bench) {
    Image planar("I420", width, height), small("I420", 1280, 720);
    std::printf("workers at once: %d\n", qvThreadPool().width());
    bench.compare(
        "I420 1080 to 720, all workers : one", 0.56, [&] { ours(planar, small, QvScale::standard, 0); },
        [&] { ours(planar, small, QvScale::standard); });
}

// --- Every pair of formats.

constexpr int bandLines = 270;  // of a picture: the order counts, not the last percent

std::string nameOf(int format) {
    std::string name = srk::formats()[static_cast<size_t>(format)].name;
    if (const auto at = name.find("XX"); at != std::string::npos) name.replace(at, 2, "10");
    name.resize(4, ' ');
    return name;
}

size_t bytesOf(int format) {
    srk::Picture picture;
    picture.format = &srk::formats()[static_cast<size_t>(format)];
    picture.width = width;
    picture.height = bandLines;
    srk::Byte base = 0;
    srk::layOut(picture, &base, 0);
    size_t bytes = 0;
    for (int p = 0; p < picture.format->planes(); ++p)
        bytes += static_cast<size_t>(picture.planes[p].stride) * static_cast<size_t>(picture.planeHeight(p));
    return bytes;
}

template <class Work>
double secondsOf(const Work& work) {
    const double begin = qvBenchSeconds(QvBenchClock::thread);
    work();
    return qvBenchSeconds(QvBenchClock::thread) - begin;
}

void worstPairs() {
    constexpr double limit = 5;
    struct Pair {
        std::string name;
        double ratio;
    };
    std::vector<Pair> pairs;
    std::vector<uint8_t> from(static_cast<size_t>(width) * bandLines * 16 + 64, 100), to(from.size());
    const auto codeOf = [](const std::string& name) {
        unsigned code = 0;
        std::memcpy(&code, name.data(), 4);
        return code;
    };
    for (int s = 0; s < srk::formatCount; ++s)
        for (int t = 0; t < srk::formatCount; ++t) {
            const std::string source = nameOf(s), target = nameOf(t);
            double ours = 1e9, copies = 1e9;
            for (int round = 0; round < 5; ++round) {  // in turn: both see the same caches and neighbours
                ours = std::min(ours, secondsOf([&] {
                                    SRScaler(QvScale::oneThread, codeOf(source), from.data(), 0, width,
                                             bandLines, codeOf(target), to.data(), 0, width, bandLines, 0,
                                             QvScale::standard, nullptr);
                                }));
                copies = std::min(copies, secondsOf([&] {
                                      std::memcpy(to.data(), from.data(), bytesOf(s));
                                      std::memcpy(to.data(), from.data(), bytesOf(t));
                                  }));
            }
            pairs.push_back({source + " to " + target, ours / copies});
        }
    std::sort(pairs.begin(), pairs.end(), [](const Pair& a, const Pair& b) { return a.ratio > b.ratio; });
    const auto above =
        std::count_if(pairs.begin(), pairs.end(), [](const Pair& p) { return p.ratio > limit; });
    std::printf("pairs of formats above %.0f times a memcpy of input and output: %ld of %zu; the worst:\n",
                limit, static_cast<long>(above), pairs.size());
    for (size_t i = 0; i < 12; ++i) std::printf("    %-16s %6.2f\n", pairs[i].name.c_str(), pairs[i].ratio);
}

// Both sides as on a machine without AVX-512.
void withoutAvx512() {
    hwy::GetChosenTarget().Update(hwy::SupportedTargets() & (HWY_AVX2 | HWY_SSE4 | HWY_STATIC_TARGET));
#ifdef QV_HAVE_LIBYUV
    libyuv::MaskCpuFlags(libyuv::kCpuHasX86 | libyuv::kCpuHasSSE2 | libyuv::kCpuHasSSSE3 |
                         libyuv::kCpuHasSSE41 | libyuv::kCpuHasSSE42 | libyuv::kCpuHasAVX |
                         libyuv::kCpuHasAVX2 | libyuv::kCpuHasERMS | libyuv::kCpuHasFMA3 |
                         libyuv::kCpuHasF16C);
#endif
}

}  // namespace

// "avx2" as its argument: without AVX-512.
int main(int count, char** words) {
    if (count > 1 && std::string_view(words[1]) == "avx2") withoutAvx512();
    QvRatioBench bench("pictures of 1920 x 1080, one thread, its processor time", QvBenchClock::thread);
#ifdef QV_HAVE_LIBYUV
    againstLibyuv(bench);
#endif
#ifdef QV_HAVE_LIBSWSCALE
    againstSwscale(bench);
#endif
#ifdef QV_HAVE_ZIMG
    againstZimg(bench);
#endif
    QvRatioBench together("all workers, wall clock");
    workers(together);
    worstPairs();
}
