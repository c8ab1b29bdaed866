// Stands for the encoders of a film: hands the packets of a film over in elementary form, as encoders do.
#pragma once

#include <cmath>
#include <cstring>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "core/encode/qvmuxer.h"
#include "core/engine/modules/qvregistry.h"
#include "core/stream/qvbufstrm.h"
#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/mediainput.h"
#include "plugins/wire.h"

extern "C" {
#include <libavcodec/bsf.h>
}

class UnitSender {
  public:
    // An encoder that a multiplexer asks for nothing.
    class Encoder : public QvEncoder {
      public:
        Encoder() { init(); }
        int setParam(const char*, const Any&) override { return 0; }
        int open() override { return 0; }
        int close() override { return 0; }
        void* getInterface(int) const override { return nullptr; }
    };
    struct Unit {
        std::size_t stream;
        std::string bytes;
        std::int64_t pts, dts, duration;
        bool key;
    };
    struct Stream {
        bool video = false;
        std::string fourcc, extradata, finalData;
        QvWire::VideoHead picture{};
        QvWire::AudioHead sound{};
        AVRational base{};
        QvBufStream* to = nullptr;
        long long units = 0;
        std::unique_ptr<Encoder> encoder = std::make_unique<Encoder>();
    };

    // Reads all of a film. One that was made of another has that one's frame rates, which not every container
    // says.
    explicit UnitSender(const std::string& film, const UnitSender* origin = nullptr) {
        std::string reason;
        const av::MediaBytes bytes{Any(film.c_str())};
        const auto input = av::MediaInput::open(bytes, "", reason);
        if (!input) return;
        for (unsigned i = 0; i < input->context().nb_streams; ++i)
            addStream(*input->context().streams[i], origin);
        const av::PacketPtr packet(av_packet_alloc());
        while (input->read(*packet) == av::MediaInput::Read::packet) {
            addPacket(*input->context().streams[packet->stream_index], *packet);
            av_packet_unref(packet.get());
        }
        for (AVBSFContext*& filter : filters_) av_bsf_free(&filter);
        for (std::size_t i = 0; i < streams.size(); ++i)
            if (streams[i].video) setDecodingTimes(i);
    }

    bool addTo(QvMuxer& muxer) {
        for (Stream& stream : streams) {
            stream.encoder = std::make_unique<Encoder>();  // one before knows a stream that has gone
            stream.to = muxer.addStream(stream.video ? qvVideoStream : qvAudioStream, AnyDict());
            if (!stream.to) return false;
            stream.encoder->attachOutStream(stream.to);
        }
        return true;
    }
    bool sendHeads() {
        bool ok = true;
        for (Stream& stream : streams) ok = sendHead(stream) && ok;
        return ok;
    }
    bool sendHead(Stream& stream) {
        if (stream.video) return tell(stream, QvAuxId::VIDEO_STREAM_INFO, stream.picture);
        return tell(stream, QvAuxId::AUDIO_STREAM_INFO, stream.sound);
    }
    // The first `count` units, in pieces.
    bool sendUnits(std::size_t count = SIZE_MAX) {
        for (std::size_t i = 0; i < units.size() && i < count; ++i)
            if (!sendUnit(units[i])) return false;
        for (Stream& stream : streams)  // as an encoder's close, which knows what is left at the end
            if ((stream.sound.trailingPadding > 0 || changeOwnData(stream)) && !sendHead(stream))
                return false;
        return true;
    }
    bool sendUnit(Unit& unit) {
        constexpr std::size_t piece = 1000;
        Stream& stream = streams[unit.stream];
        bufstream* const out = stream.to->input();
        for (std::size_t at = 0; at < unit.bytes.size(); at += piece) {
            const auto now = static_cast<unsigned>(std::min(piece, unit.bytes.size() - at));
            unsigned char* const block = out->request(out, now);
            if (!block) return false;
            std::memcpy(block, unit.bytes.data() + at, now);
            if (out->confirm(out, now) != now) return false;
        }
        const auto bytes = static_cast<std::uint32_t>(unit.bytes.size());
        if (stream.video) {
            QvWire::VideoUnit record{bytes,
                                     QvWire::unitTimed | (unit.key ? QvWire::unitKey : 0),
                                     unit.pts,
                                     unit.dts,
                                     static_cast<std::uint32_t>(unit.duration),
                                     0};
            return tell(stream, QvAuxId::VIDEO_AU_CODE, record);
        }
        QvWire::AudioUnit record{bytes, static_cast<std::uint32_t>(unit.duration) | QvWire::unitTimed,
                                 unit.pts};
        return tell(stream, QvAuxId::AUDIO_AU_CODE, record);
    }
    static bool changeOwnData(Stream& stream) {
        if (stream.finalData.empty()) return false;
        stream.sound.extradata = stream.finalData.data();
        stream.sound.extradataBytes = stream.finalData.size();
        return true;
    }
    // Stands for all encoders going: the streams know no writer any more.
    void detach() {
        for (Stream& stream : streams)
            if (stream.to) stream.to->setAtachee(nullptr);
    }

    std::vector<Stream> streams;
    std::vector<Unit> units;

  private:
    std::vector<AVBSFContext*> filters_;
    std::map<std::size_t, std::int64_t> next_;

    template <class Record>
    static bool tell(Stream& stream, unsigned id, Record& record) {
        bufstream* const out = stream.to->input();
        return out->auxinfo(out, 0, id, &record, sizeof record) == 0;
    }

    // As an encoder counts: one a frame, early enough for each to be decoded before it is shown.
    void setDecodingTimes(std::size_t stream) {
        std::vector<std::int64_t> shown;
        for (const Unit& unit : units)
            if (unit.stream == stream) shown.push_back(unit.pts);
        std::vector<std::int64_t> coded = shown;
        std::sort(shown.begin(), shown.end());
        std::int64_t delay = 0;
        for (std::size_t i = 0; i < coded.size(); ++i) delay = std::max(delay, shown[i] - coded[i]);
        streams[stream].picture.delay = static_cast<std::int32_t>(std::clamp<std::int64_t>(delay, 0, 100));
        std::size_t next = 0;
        for (Unit& unit : units)
            if (unit.stream == stream) unit.dts = shown[next++] - delay;
    }

    void addStream(const AVStream& from, const UnitSender* origin) {
        static const std::map<AVCodecID, const char*> codes = {
            {AV_CODEC_ID_H264, "H264"},       {AV_CODEC_ID_HEVC, "HEVC"},
            {AV_CODEC_ID_AV1, "AV01"},        {AV_CODEC_ID_VP8, "VP80"},
            {AV_CODEC_ID_VP9, "VP90"},        {AV_CODEC_ID_MPEG1VIDEO, "MPG1"},
            {AV_CODEC_ID_MPEG2VIDEO, "MPG2"}, {AV_CODEC_ID_MPEG4, "MP4V"},
            {AV_CODEC_ID_DNXHD, "AVdn"},      {AV_CODEC_ID_DVVIDEO, "DVSD"},
            {AV_CODEC_ID_JPEG2000, "MJ2K"},   {AV_CODEC_ID_PRORES, "PRRS"},
            {AV_CODEC_ID_FFV1, "FFV1"},       {AV_CODEC_ID_MJPEG, "MJPG"},
            {AV_CODEC_ID_AAC, "AAC "},        {AV_CODEC_ID_MP2, "MP2 "},
            {AV_CODEC_ID_MP3, "MP3 "},        {AV_CODEC_ID_AC3, "AC-3"},
            {AV_CODEC_ID_EAC3, "EAC3"},       {AV_CODEC_ID_FLAC, "FLAC"},
            {AV_CODEC_ID_OPUS, "OPUS"},       {AV_CODEC_ID_VORBIS, "VORB"},
            {AV_CODEC_ID_PCM_S16LE, "PCM "},  {AV_CODEC_ID_PCM_S24LE, "PCM "},
        };
        const AVCodecParameters& is = *from.codecpar;
        Stream& to = streams.emplace_back();
        to.video = is.codec_type == AVMEDIA_TYPE_VIDEO;
        const auto code = codes.find(is.codec_id);
        to.fourcc = code == codes.end() ? "????" : code->second;
        to.base = to.video ? av_inv_q(from.avg_frame_rate) : AVRational{1, is.sample_rate};
        if (origin && streams.size() <= origin->streams.size())
            to.base = origin->streams[streams.size() - 1].base;
        AVBSFContext* filter = nullptr;
        const bool boxed = is.extradata_size > 0 && is.extradata[0] == 1;
        if (boxed && (is.codec_id == AV_CODEC_ID_H264 || is.codec_id == AV_CODEC_ID_HEVC)) {
            av_bsf_alloc(
                av_bsf_get_by_name(is.codec_id == AV_CODEC_ID_H264 ? "h264_mp4toannexb" : "hevc_mp4toannexb"),
                &filter);
            avcodec_parameters_copy(filter->par_in, &is);
            av_bsf_init(filter);
        } else if (is.extradata) {
            to.extradata.assign(reinterpret_cast<const char*>(is.extradata),
                                static_cast<size_t>(is.extradata_size));
        }
        filters_.push_back(filter);
        std::uint32_t fourcc = 0;
        std::memcpy(&fourcc, to.fourcc.data(), 4);
        to.picture = {sizeof to.picture,
                      QvWire::version,
                      fourcc,
                      is.field_order == AV_FIELD_TT   ? QvWire::FieldOrder::topFirst
                      : is.field_order == AV_FIELD_BB ? QvWire::FieldOrder::bottomFirst
                                                      : QvWire::FieldOrder::progressive,
                      to.base.den,
                      to.base.num,
                      is.width,
                      is.height,
                      is.sample_aspect_ratio.num,
                      std::max(is.sample_aspect_ratio.den, 1),
                      static_cast<std::uint16_t>(is.color_primaries),
                      static_cast<std::uint16_t>(is.color_trc),
                      static_cast<std::uint16_t>(is.color_space),
                      is.color_range == AVCOL_RANGE_JPEG,
                      is.video_delay,
                      is.profile,
                      is.level,
                      0,
                      nullptr,
                      0};
        to.sound = {sizeof to.sound,
                    QvWire::version,
                    fourcc,
                    is.sample_rate,
                    is.ch_layout.nb_channels,
                    is.bits_per_coded_sample ? is.bits_per_coded_sample : is.bits_per_raw_sample,
                    0,
                    is.frame_size,
                    is.initial_padding,
                    0,
                    static_cast<std::int32_t>(is.bit_rate),
                    is.profile,
                    0,
                    nullptr,
                    0};
    }

    void addPacket(const AVStream& from, AVPacket& packet) {
        const auto number = static_cast<std::size_t>(from.index);
        Stream& stream = streams[number];
        if (AVBSFContext* const filter = filters_[number]) {
            if (av_bsf_send_packet(filter, &packet) < 0 || av_bsf_receive_packet(filter, &packet) < 0) return;
        }
        const auto scaled = [&](std::int64_t time) {
            return av_rescale_q(time, from.time_base, stream.base);
        };
        Unit unit{number,
                  std::string(reinterpret_cast<char*>(packet.data), static_cast<size_t>(packet.size)),
                  scaled(packet.pts),
                  scaled(packet.dts),
                  std::max<std::int64_t>(scaled(packet.duration), 1),
                  (packet.flags & AV_PKT_FLAG_KEY) != 0};
        if (stream.video) {
            unit.duration = 1;
            if (stream.fourcc == "MP4V" && unit.key) unit.bytes = stream.extradata + unit.bytes;
        } else {  // in samples, where the container has milliseconds
            const std::int64_t heard = unit.duration;
            const int known = av_get_audio_frame_duration2(from.codecpar, packet.size);
            if (known > 0) unit.duration = known;
            stream.sound.trailingPadding =
                static_cast<std::int32_t>(std::max<std::int64_t>(unit.duration - heard, 0));
            if (stream.sound.trailingPadding < 64) stream.sound.trailingPadding = 0;  // rounding
            if (stream.units == 0 && stream.sound.initialPadding == 0 && unit.pts < 0)
                stream.sound.initialPadding = static_cast<std::int32_t>(-unit.pts);
            if (stream.units == 0) next_[number] = -stream.sound.initialPadding;
            unit.pts = unit.dts = next_[number];
            next_[number] += unit.duration;
            if (from.codecpar->codec_id == AV_CODEC_ID_AAC && from.codecpar->extradata_size >= 2)
                unit.bytes = adts(from, unit.bytes) + unit.bytes;
        }
        ++stream.units;
        if (stream.units == 1 && !stream.extradata.empty() && stream.fourcc != "AAC ") pointOut(stream);
        units.push_back(std::move(unit));
    }
    void pointOut(Stream& stream) {
        stream.picture.extradata = stream.sound.extradata = stream.extradata.data();
        stream.picture.extradataBytes = stream.sound.extradataBytes = stream.extradata.size();
    }
    static std::string adts(const AVStream& from, const std::string& unit) {
        const AVCodecParameters& is = *from.codecpar;
        const unsigned first = is.extradata[0], second = is.extradata[1];
        const unsigned object = first >> 3, rate = (first & 7) << 1 | second >> 7,
                       channels = second >> 3 & 15;
        const std::size_t bytes = unit.size() + 7;
        std::string head = {'\xff', '\xf1'};
        head += static_cast<char>((object - 1) << 6 | rate << 2 | channels >> 2);
        head += static_cast<char>((channels & 3) << 6 | bytes >> 11);
        head += static_cast<char>(bytes >> 3);
        head += static_cast<char>((bytes & 7) << 5 | 0x1f);
        return head + '\xfc';
    }
};
