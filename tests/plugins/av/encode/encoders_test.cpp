// Every encoder: what it writes is decoded again by the libraries and compared with what it was given.
#include "plugins/av/encode/encoders.h"

#include <cmath>
#include <cstring>
#include <memory>

#include "core/arch/qvexception.h"
#include "core/caption/cc/qvcc.h"
#include "core/encode/qvencoder.h"
#include "core/measure/qvgeometry.h"
#include "core/media/qvbuffer.h"
#include "core/stream/nav/qvmetadatafile.h"
#include "core/stream/qvbufstrm.h"
#include "plugins/av/encode/frameinput.h"
#include "plugins/av/source/avheaders.h"
#include "plugins/wire.h"
#include "tests/support/temp_folder.h"

namespace {

// Keeps units and heads. Its blocks are small, so that no unit fits into one.
class Collector : public QvBufStream {
  public:
    Collector() {
        record_.usable = [](bufstream*) { return 1000u; };
        record_.chunksize = [](bufstream*) { return 700u; };
        record_.request = [](bufstream* s, unsigned n) { return of(s).request(n); };
        record_.confirm = [](bufstream* s, unsigned n) {
            of(s).bytes_.append(of(s).block_, 0, n);
            return n;
        };
        record_.auxinfo = [](bufstream* s, unsigned, unsigned id, void* info, unsigned) {
            return of(s).hear(id, info);
        };
        record_.context = this;
    }
    bufstream* input() override { return &record_; }
    bufstream* output() override { return nullptr; }

    std::vector<QvWire::VideoHead> videoHeads;
    std::vector<QvWire::AudioHead> soundHeads;
    std::vector<std::string> ownData;  // of each head
    std::vector<QvWire::VideoUnit> pictures;
    std::vector<QvWire::AudioUnit> sounds;
    std::vector<std::string> units;
    bool full = false;

  private:
    static Collector& of(bufstream* s) { return *static_cast<Collector*>(s->context); }
    unsigned char* request(unsigned n) {
        if (full) return nullptr;
        block_.resize(n);
        return reinterpret_cast<unsigned char*>(block_.data());
    }
    template <class Head>
    void keep(std::vector<Head>& heads, const void* info) {
        heads.push_back(*static_cast<const Head*>(info));
        ownData.emplace_back(static_cast<const char*>(heads.back().extradata), heads.back().extradataBytes);
    }
    unsigned hear(unsigned id, void* info) {
        if (id == QvAuxId::VIDEO_STREAM_INFO) keep(videoHeads, info);
        if (id == QvAuxId::AUDIO_STREAM_INFO) keep(soundHeads, info);
        if (id == QvAuxId::VIDEO_AU_CODE) pictures.push_back(*static_cast<QvWire::VideoUnit*>(info));
        if (id == QvAuxId::AUDIO_AU_CODE) sounds.push_back(*static_cast<QvWire::AudioUnit*>(info));
        if (id == QvAuxId::VIDEO_AU_CODE || id == QvAuxId::AUDIO_AU_CODE) {
            EXPECT_EQ(*static_cast<std::uint32_t*>(info), bytes_.size());
            units.push_back(std::move(bytes_));
            bytes_.clear();
        }
        return 0;
    }
    bufstream record_{};
    std::string block_, bytes_;
};

template <class Encoder>
std::unique_ptr<Encoder> made(const char* name, const AnyDict& settings) {
    std::unique_ptr<Encoder> encoder(static_cast<Encoder*>(av::newEncoder(name)));
    encoder->init();
    for (const auto [key, value] : settings)
        EXPECT_EQ(encoder->setParam(key, *value), 0) << name << " " << key;
    return encoder;
}

// Slopes that move, in video levels.
void paint(QvFrame& frame, int nr) {
    const bool words = frame.four_cc() == QvFourcc::W016 || frame.four_cc() == QvFourcc::Y216 ||
                       frame.four_cc() == QvFourcc::b64a;
    for (int plane = 0; plane < frame.planes(); ++plane)
        for (int y = 0; y < frame.height(plane); ++y) {
            unsigned char* const row = frame.plane(plane) + std::ptrdiff_t{y} * frame.stride(plane);
            for (int x = 0; x < frame.bytes(plane) / frame.height(plane); ++x)
                row[x] = static_cast<unsigned char>(
                    words && x % 2 == 0 ? 0 : 40 + (x / (words ? 8 : 4) + 2 * y + 3 * nr) % 160);
        }
}

// Pictures that a decoder makes of the units, each as the encoder's layout has it.
std::vector<av::FramePtr> decoded(const Collector& out, AVCodecID id) {
    std::vector<av::FramePtr> all;
    av::CodecPtr decoder(avcodec_alloc_context3(avcodec_find_decoder(id)));
    av_log_set_level(AV_LOG_QUIET);
    const std::string& own = out.ownData.front();
    if (!own.empty()) {
        decoder->extradata =
            static_cast<std::uint8_t*>(av_mallocz(own.size() + AV_INPUT_BUFFER_PADDING_SIZE));
        std::memcpy(decoder->extradata, own.data(), own.size());
        decoder->extradata_size = static_cast<int>(own.size());
    }
    if (!out.videoHeads.empty()) {
        decoder->width = out.videoHeads.front().width;
        decoder->height = out.videoHeads.front().height;
    }
    if (!out.soundHeads.empty()) {
        decoder->sample_rate = out.soundHeads.front().rate;
        av_channel_layout_default(&decoder->ch_layout, out.soundHeads.front().channels);
    }
    EXPECT_EQ(avcodec_open2(decoder.get(), nullptr, nullptr), 0);
    const av::PacketPtr packet(av_packet_alloc());
    const auto receive = [&] {
        for (;;) {
            av::FramePtr frame(av_frame_alloc());
            if (avcodec_receive_frame(decoder.get(), frame.get()) < 0) return;
            all.push_back(std::move(frame));
        }
    };
    for (const std::string& unit : out.units) {
        EXPECT_EQ(av_new_packet(packet.get(), static_cast<int>(unit.size())), 0);
        std::memcpy(packet->data, unit.data(), unit.size());
        EXPECT_EQ(avcodec_send_packet(decoder.get(), packet.get()), 0);
        av_packet_unref(packet.get());
        receive();
    }
    avcodec_send_packet(decoder.get(), nullptr);
    receive();
    return all;
}

// Of the luma or the first plane, in 8 bits.
double quality(const AVFrame& a, const AVFrame& b) {
    EXPECT_EQ(a.format, b.format);
    const auto* const layout = av_pix_fmt_desc_get(static_cast<AVPixelFormat>(a.format));
    const bool words = layout->comp[0].depth > 8;
    double sum = 0;
    for (int y = 0; y < a.height; ++y)
        for (int x = 0; x < a.width; ++x) {
            const auto at = [&](const AVFrame& f) {
                const std::uint8_t* const row = f.data[0] + std::ptrdiff_t{y} * f.linesize[0];
                if (!words) return double{static_cast<double>(row[x])};
                std::uint16_t value = 0;
                std::memcpy(&value, row + 2 * x, 2);
                return value / static_cast<double>(1 << (layout->comp[0].depth - 8));
            };
            sum += (at(a) - at(b)) * (at(a) - at(b));
        }
    return sum == 0 ? 100 : 10 * std::log10(255.0 * 255 * a.width * a.height / sum);
}

struct Case {
    const char* module;
    AVCodecID decoder;
    unsigned fourcc;
    int width, height;
    double rate;
    int interlaced;
    double least;  // of the quality in dB; 100: lossless
    AnyDict more;
};

constexpr int frames = 12;

int write(QvVideoEncoder& encoder, unsigned fourcc, int width, int height, int count) {
    QvFrame frame;
    frame.init(fourcc, width, height);
    for (int i = 0; i < count; ++i) {
        paint(frame, i);
        if (const int result = encoder.writeFrame(&frame)) return result;
    }
    return 0;
}

TEST(VideoEncoders, WriteWhatADecoderReads) {
    using namespace QvFourcc;
    const Case cases[] = {
        {"h264venc", AV_CODEC_ID_H264, I420, 98, 66, 25, 0, 35, AnyDict("preset", "fast", "M", 3)},
        {"h264venc", AV_CODEC_ID_H264, W016, 96, 64, 25, 1, 35, AnyDict()},
        {"h264venc", AV_CODEC_ID_H264, Y216, 96, 64, 29.97, 2, 35, AnyDict("N", 1)},
        {"mpegvenc", AV_CODEC_ID_MPEG2VIDEO, I420, 96, 64, 25, 1, 30, AnyDict()},
        {"mpegvenc", AV_CODEC_ID_MPEG2VIDEO, YUYV, 96, 64, 25, 0, 30, AnyDict("M", 1)},
        {"mpegvenc", AV_CODEC_ID_MPEG1VIDEO, I420, 96, 64, 25, 0, 28, AnyDict("standard", "MPEG-1")},
        {"mpeg4venc", AV_CODEC_ID_MPEG4, I420, 96, 64, 25, 0, 28, AnyDict()},
        {"vc3venc", AV_CODEC_ID_DNXHD, YUYV, 256, 120, 25, 0, 35, AnyDict()},
        {"vc3venc", AV_CODEC_ID_DNXHD, Y216, 256, 120, 25, 0, 35, AnyDict()},
        {"vc3venc", AV_CODEC_ID_DNXHD, YUYV, 1920, 1080, 25, 1, 35, AnyDict()},
        {"dvvenc", AV_CODEC_ID_DVVIDEO, YUYV, 720, 576, 25, 2, 30, AnyDict()},
        {"dvvenc", AV_CODEC_ID_DVVIDEO, YUYV, 720, 480, 29.97, 2, 30, AnyDict()},
        {"dvvenc", AV_CODEC_ID_DVVIDEO, YUYV, 720, 576, 25, 2, 30, AnyDict("codecProfile", "50")},
        {"dv100venc", AV_CODEC_ID_DVVIDEO, YUYV, 960, 720, 50, 0, 30, AnyDict()},
        {"mj2kvenc", AV_CODEC_ID_JPEG2000, YUYV, 96, 64, 25, 0, 30, AnyDict()},
        {"h265venc", AV_CODEC_ID_HEVC, I420, 96, 64, 25, 0, 35, AnyDict("preset", "ultrafast")},
        {"proresvenc", AV_CODEC_ID_PRORES, Y216, 96, 64, 25, 1, 35, AnyDict()},
        {"ffv1venc", AV_CODEC_ID_FFV1, I420, 97, 65, 25, 0, 100, AnyDict()},
        {"ffv1venc", AV_CODEC_ID_FFV1, Y216, 97, 65, 25, 0, 100, AnyDict()},
        {"ffv1venc", AV_CODEC_ID_FFV1, W016, 96, 64, 25, 0, 100, AnyDict()},
        {"ffv1venc", AV_CODEC_ID_FFV1, BGRA, 97, 65, 25, 0, 100, AnyDict()},
        {"av1venc", AV_CODEC_ID_AV1, I420, 96, 64, 25, 0, 33, AnyDict("preset", "8")},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.module + std::string(" ") + qvFourccText(c.fourcc).data() + " " +
                     std::to_string(c.height));
        const auto encoder =
            made<QvVideoEncoder>(c.module, AnyDict("width", c.width, "height", c.height, "threads", 2,
                                                   "framerate", QvFramerate(c.rate, c.interlaced)));
        for (const auto [key, value] : c.more) EXPECT_EQ(encoder->setParam(key, *value), 0) << key;
        EXPECT_EQ(encoder->setParam("type", static_cast<int>(c.fourcc)), 0);
        EXPECT_EQ(encoder->QvCodec::getParam("selectedFOURCC"), static_cast<int>(c.fourcc));
        Collector out;
        encoder->attachOutStream(&out);
        if (encoder->open() != 0) {
            ADD_FAILURE() << encoder->errorDesc();
            continue;
        }
        EXPECT_EQ(write(*encoder, c.fourcc, c.width, c.height, frames), 0) << encoder->errorDesc();
        EXPECT_EQ(encoder->close(), 0) << encoder->errorDesc();
        ASSERT_EQ(out.videoHeads.size(), 1u);
        EXPECT_EQ(static_cast<int>(out.videoHeads[0].fieldOrder), c.interlaced);
        EXPECT_EQ(out.videoHeads[0].width, c.width);
        ASSERT_EQ(out.units.size(), static_cast<std::size_t>(frames));
        EXPECT_TRUE(out.pictures[0].flags & QvWire::unitKey);
        std::vector<bool> shown(frames);
        for (std::size_t i = 0; i < out.pictures.size(); ++i) {
            const QvWire::VideoUnit& unit = out.pictures[i];
            if (unit.pts >= 0 && unit.pts < frames) shown[static_cast<std::size_t>(unit.pts)] = true;
            EXPECT_LE(unit.dts, unit.pts);
            if (i > 0) {
                EXPECT_GT(unit.dts, out.pictures[i - 1].dts);
            }
        }
        EXPECT_EQ(shown, std::vector<bool>(frames, true));
        const auto pictures = decoded(out, c.decoder);
        ASSERT_EQ(pictures.size(), static_cast<std::size_t>(frames));
        av::FrameInput wanted;
        QvFrame frame;
        frame.init(c.fourcc, c.width, c.height);
        for (int i = 0; i < frames; ++i) {
            const AVFrame& got = *pictures[static_cast<std::size_t>(i)];
            ASSERT_TRUE(wanted.open(c.fourcc, static_cast<AVPixelFormat>(got.format), c.width, c.height,
                                    AVCOL_SPC_BT709, false));
            paint(frame, i);
            EXPECT_GE(quality(*wanted.take(frame), got), c.least) << i;
        }
    }
}

TEST(VideoEncoders, KeepCaptions) {
    for (const auto& [module, codec] :
         {std::pair{"h264venc", AV_CODEC_ID_H264}, std::pair{"mpegvenc", AV_CODEC_ID_MPEG2VIDEO}}) {
        SCOPED_TRACE(module);
        const auto encoder =
            made<QvVideoEncoder>(module, AnyDict("width", 96, "height", 64, "framerate", QvFramerate(25.0)));
        Collector out;
        encoder->attachOutStream(&out);
        ASSERT_EQ(encoder->open(), 0) << encoder->errorDesc();
        QvFrame frame;
        frame.init(QvFourcc::I420, 96, 64);
        std::vector<std::string> wanted(frames);
        // More than a picture holds in the third one: the rest comes with the next.
        for (int i = 0; i < frames; ++i) {
            QvCcData captions;
            for (int k = 0; k < (i == 2 ? 40 : i % 3); ++k)
                captions.append(QvCcBytePair(i & 1, 'a' + i, 'A' + k, true));
            AnyDict carried;
            captions.store(carried);
            frame.setSubpic(carried);
            paint(frame, i);
            EXPECT_EQ(encoder->writeFrame(&frame), 0);
            for (int k = 0; k < captions.count(); ++k)
                wanted[static_cast<std::size_t>(k < 31 ? i : i + 1)] +=
                    {static_cast<char>(captions.at(k).header), static_cast<char>(captions.at(k).byte1),
                     static_cast<char>(captions.at(k).byte2)};
        }
        EXPECT_EQ(encoder->close(), 0);
        const auto pictures = decoded(out, codec);
        ASSERT_EQ(pictures.size(), wanted.size());
        for (std::size_t i = 0; i < wanted.size(); ++i) {
            const AVFrameSideData* const block =
                av_frame_get_side_data(pictures[i].get(), AV_FRAME_DATA_A53_CC);
            const std::string got =
                block ? std::string(reinterpret_cast<const char*>(block->data), block->size) : "";
            EXPECT_EQ(got, wanted[i]) << i;
        }
    }
}

TEST(VideoEncoders, SecondPassHitsTheRate) {
    for (const char* module : {"h264venc", "h265venc", "mpegvenc", "mpeg4venc"}) {
        SCOPED_TRACE(module);
        const AnyDict settings("width", 320, "height", 240, "framerate", QvFramerate(25.0), "vBitrate",
                               300e3);
        TempFolder folder;
        QvMetadataFile record;
        record.init(Any(folder.file("pass").c_str()), false);
        const Any meta(static_cast<const void*>(record.metadata()));
        Collector none, out;
        const auto second = made<QvVideoEncoder>(module, settings);
        second->attachOutStream(&out);
        EXPECT_EQ(second->setParam("meta", meta), 0);
        EXPECT_NE(second->open(), 0) << "without a first pass";
        const auto first = made<QvVideoEncoder>(module, settings);
        EXPECT_EQ(first->setParam("meta", meta), 0);
        EXPECT_EQ(first->setParam("firstPass", 1), 0);
        first->attachOutStream(&none);
        ASSERT_EQ(first->open(), 0) << first->errorDesc();
        EXPECT_EQ(write(*first, QvFourcc::I420, 320, 240, 100), 0);
        EXPECT_EQ(first->close(), 0) << first->errorDesc();
        EXPECT_TRUE(none.units.empty());
        ASSERT_EQ(second->open(), 0) << second->errorDesc();
        EXPECT_EQ(write(*second, QvFourcc::I420, 320, 240, 100), 0);
        EXPECT_EQ(second->close(), 0) << second->errorDesc();
        std::size_t bytes = 0;
        for (const std::string& unit : out.units) bytes += unit.size();
        EXPECT_NEAR(static_cast<double>(bytes) * 8 / 4, 300e3, 90e3);
    }
}

TEST(VideoEncoders, RefuseWhatTheyCanNotDo) {
    const auto encoder =
        made<QvVideoEncoder>("h264venc", AnyDict("width", 96, "height", 64, "framerate", QvFramerate(25.0)));
    const struct {
        const char* name;
        Any value;
    } wrong[] = {{"crf", 99},
                 {"crf", "good"},
                 {"preset", "quickest"},
                 {"preset", "fast:stats=x"},
                 {"vBitrate", -1.0},
                 {"vBitrate", 1e12},
                 {"framerate", 0},
                 {"type", 12},
                 {"M", 99},
                 {"width", -2},
                 {"avOptions", "bogus=1"},
                 {"avOptions", "no equals sign"},
                 {"avOptions", "stats=/tmp/x"},
                 {"avOptions", "x264-params=dump-yuv=/tmp/x"},
                 {"avOptions", "x264-params=pass=1"},
                 {"avOptions", "flags=+pass1"},
                 {"avOptions", "threads=9"},
                 {"avOptions", "time_base=1/9"},
                 {"avOptions", "colorspace=rgb"},
                 {"meta", "text"}};
    for (const auto& row : wrong) EXPECT_NE(encoder->setParam(row.name, row.value), 0) << row.name;
    EXPECT_NE(encoder->setParam("avOptions", "aq-mod=1"), 0);
    EXPECT_NE(std::string(encoder->errorDesc()).find("aq-mode"), std::string::npos) << encoder->errorDesc();
    Collector out;
    EXPECT_NE(encoder->open(), 0) << "without an output";
    encoder->attachOutStream(&out);
    ASSERT_EQ(encoder->open(), 0) << encoder->errorDesc();
    EXPECT_NE(write(*encoder, QvFourcc::I420, 98, 64, 1), 0);
    EXPECT_NE(write(*encoder, QvFourcc::BGR3, 96, 64, 1), 0);
    EXPECT_NE(encoder->writeFrame(nullptr), 0);
    EXPECT_EQ(write(*encoder, QvFourcc::I420, 96, 64, 3), 0);
    out.full = true;
    EXPECT_NE(encoder->close(), 0) << "a full output is told";
    out.full = false;
    ASSERT_EQ(encoder->open(), 0);
    EXPECT_EQ(write(*encoder, QvFourcc::I420, 96, 64, 3), 0);
    EXPECT_EQ(encoder->abort(), 0);
    EXPECT_TRUE(out.units.empty());
}

TEST(SoundEncoders, WriteWhatADecoderReads) {
    const struct {
        const char* module;
        AVCodecID decoder;
        int bits, channels;
        bool lossless;
    } cases[] = {{"aacaenc", AV_CODEC_ID_AAC, 16, 2, false},
                 {"mpegaenc", AV_CODEC_ID_MP2, 16, 2, false},
                 {"mpegpcmenc", AV_CODEC_ID_PCM_S16LE, 16, 2, true},
                 {"mpegpcmenc", AV_CODEC_ID_PCM_S24LE, 24, 3, true},
                 {"mp3aenc", AV_CODEC_ID_MP3, 16, 2, false},
                 {"ddaenc", AV_CODEC_ID_AC3, 16, 2, false},
                 {"ddproaenc", AV_CODEC_ID_AC3, 24, 6, false},
                 {"ddplusproaenc", AV_CODEC_ID_EAC3, 16, 2, false},
                 {"flacaenc", AV_CODEC_ID_FLAC, 16, 2, true},
                 {"flacaenc", AV_CODEC_ID_FLAC, 24, 2, true},
                 {"opusaenc", AV_CODEC_ID_OPUS, 16, 2, false}};
    constexpr int count = 20000;
    for (const auto& c : cases) {
        SCOPED_TRACE(c.module + std::to_string(c.bits));
        const auto encoder =
            made<QvAudioEncoder>(c.module, AnyDict("bitsPerSample", c.bits, "channels", c.channels));
        AnyDict stored;
        encoder->store(stored);
        EXPECT_EQ(encoder->restore(stored), 0) << encoder->errorDesc();
        Collector out;
        encoder->attachOutStream(&out);
        if (encoder->open() != 0) {
            ADD_FAILURE() << encoder->errorDesc();
            continue;
        }
        QvPcm pcm;
        pcm.init(count, c.channels, c.bits / 8, 48000);
        const auto wave = [&](int i) { return 0.4 * std::sin(i * 0.05); };
        for (int i = 0; i < count; ++i)
            for (int channel = 0; channel < c.channels; ++channel) {
                const int value = static_cast<int>(std::lround(wave(i) * (1 << (c.bits - 1))));
                for (int byte = 0; byte < c.bits / 8; ++byte)
                    pcm.ptr(i)[channel * (c.bits / 8) + byte] = static_cast<unsigned char>(value >> 8 * byte);
            }
        pcm.setSamples(count);
        EXPECT_EQ(encoder->writePcm(&pcm), 0) << encoder->errorDesc();
        EXPECT_EQ(encoder->close(), 0) << encoder->errorDesc();
        long long next = -out.soundHeads.front().initialPadding;
        for (const QvWire::AudioUnit& unit : out.sounds) {
            EXPECT_EQ(unit.pts, next);
            next += unit.sampleCount();
        }
        EXPECT_EQ(next, count + out.soundHeads.back().trailingPadding);
        if (std::strcmp(c.module, "flacaenc") == 0) {
            EXPECT_NE(out.ownData.front(), out.ownData.back());
        }
        if (std::strcmp(c.module, "mpegpcmenc") == 0) continue;
        // What the decoder drops at the start is the priming, if it knows of it.
        const auto blocks = decoded(out, c.decoder);
        long long heard = 0;
        double square = 0, wrong = 0;
        for (const auto& block : blocks)
            for (int i = 0; i < block->nb_samples; ++i, ++heard) {
                const auto* const data = block->extended_data[0];
                const double value =
                    block->format == AV_SAMPLE_FMT_S16
                        ? reinterpret_cast<const std::int16_t*>(data)[i * c.channels] / 32768.0
                    : block->format == AV_SAMPLE_FMT_S16P
                        ? reinterpret_cast<const std::int16_t*>(data)[i] / 32768.0
                    : block->format == AV_SAMPLE_FMT_S32
                        ? reinterpret_cast<const std::int32_t*>(data)[i * c.channels] / 2147483648.0
                        : static_cast<double>(reinterpret_cast<const float*>(data)[i]);
                square += value * value;
                const double scale = 1 << (c.bits - 1);
                wrong += std::fabs(value - std::round(wave(static_cast<int>(heard)) * scale) / scale);
            }
        EXPECT_GE(heard, count);
        EXPECT_NEAR(square / count, 0.4 * 0.4 / 2, c.lossless ? 1e-3 : 0.02);
        if (c.lossless) {
            EXPECT_EQ(heard, count);
            EXPECT_EQ(wrong, 0);
        }
    }
}

// Each channel has a loudness of its own, so that it is known after decoding. The tone is low enough for the
// channel of low frequencies.
TEST(SoundEncoders, KeepChannelsInTheirPlaces) {
    const struct {
        const char* module;
        AVCodecID decoder;
        std::vector<int> counts;
    } cases[] = {{"aacaenc", AV_CODEC_ID_AAC, {1, 3, 4, 5, 6, 8}},
                 {"opusaenc", AV_CODEC_ID_OPUS, {1, 3, 4, 5, 6, 7, 8}},
                 {"flacaenc", AV_CODEC_ID_FLAC, {3, 4, 7}},
                 {"ddaenc", AV_CODEC_ID_AC3, {3, 4, 5, 6}}};
    constexpr int samples = 24000;
    for (const auto& c : cases)
        for (const int channels : c.counts) {
            SCOPED_TRACE(c.module + std::to_string(channels));
            const auto encoder = made<QvAudioEncoder>(c.module, AnyDict("channels", channels));
            if (c.decoder != AV_CODEC_ID_FLAC) {
                EXPECT_EQ(encoder->setParam("aBitrate", channels == 1 ? 128 : 448), 0);
            }
            Collector out;
            encoder->attachOutStream(&out);
            QvPcm pcm;
            pcm.init(samples, channels, 2, 48000);
            for (int i = 0; i < samples; ++i)
                for (int k = 0; k < channels; ++k)
                    reinterpret_cast<std::int16_t*>(pcm.ptr(i))[k] =
                        static_cast<std::int16_t>(2000 * (k + 1) * std::sin(i * 0.008 + k));
            pcm.setSamples(samples);
            ASSERT_EQ(encoder->open(), 0) << encoder->errorDesc();
            EXPECT_EQ(encoder->writePcm(&pcm), 0) << encoder->errorDesc();
            EXPECT_EQ(encoder->close(), 0) << encoder->errorDesc();
            std::vector<double> squares(static_cast<std::size_t>(channels));
            for (const auto& block : decoded(out, c.decoder)) {
                ASSERT_EQ(block->ch_layout.nb_channels, channels);
                for (int i = 0; i < block->nb_samples * channels; ++i) {
                    const int k = i % channels;
                    const bool planar = av_sample_fmt_is_planar(static_cast<AVSampleFormat>(block->format));
                    const auto* const data = block->extended_data[planar ? k : 0];
                    const int at = planar ? i / channels : i;
                    const double value = block->format == AV_SAMPLE_FMT_FLTP
                                             ? 32768.0 * reinterpret_cast<const float*>(data)[at]
                                             : reinterpret_cast<const std::int16_t*>(data)[at];
                    squares[static_cast<std::size_t>(k)] += value * value;
                }
            }
            for (int k = 0; k < channels; ++k)
                EXPECT_NEAR(std::sqrt(squares[static_cast<std::size_t>(k)] * 2 / samples) / 2000, k + 1, 0.4)
                    << k;
        }
    // Rates of MPEG-2 have bit rates of their own.
    const auto slow = made<QvAudioEncoder>("mpegaenc", AnyDict("samplerate", 22050));
    EXPECT_EQ(slow->QvCodec::getParam("aBitrate"), 160);
    EXPECT_NE(slow->setParam("aBitrate", 224), 0);
}

TEST(SoundEncoders, RefuseWhatTheyCanNotDo) {
    const auto encoder = made<QvAudioEncoder>("opusaenc", AnyDict());
    EXPECT_NE(encoder->setParam("samplerate", 44100), 0);
    EXPECT_NE(encoder->setParam("channels", 9), 0);
    EXPECT_NE(encoder->setParam("bitsPerSample", 20), 0);
    EXPECT_NE(encoder->setParam("bitrate", QvBitrate(QvBitrate::cbr, 129000)), 0);
    for (const char* options : {"bogus=1", "ar=8000", "ac=1", "ch_layout=mono", "threads=9"})
        EXPECT_NE(encoder->setParam("avOptions", options), 0) << options;
    EXPECT_NE(encoder->setParam("avOptions", "aplication=voip"), 0);
    EXPECT_NE(std::string(encoder->errorDesc()).find("'application'"), std::string::npos);
    EXPECT_EQ(av::newEncoder("nosuchenc"), nullptr);
}

}  // namespace
