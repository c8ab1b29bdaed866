#include "plugins/av/mux/picturetiming.h"

#include <algorithm>
#include <numeric>

#include "plugins/av/source/avheaders.h"

namespace av {

namespace {

struct Coded {
    int number;  // the stream's own, which begins anew with each sequence
    bool key;
    bool between;  // shown before the picture that is coded before it
};

struct FreeParser {
    void operator()(AVCodecParserContext* parser) const { av_parser_close(parser); }
};

// From one picture that begins a sequence to the next one.
void placeByNumber(const std::vector<Coded>& all, std::vector<long long>& places) {
    for (std::size_t first = 0; first < all.size();) {
        std::size_t end = first + 1;
        while (end < all.size() && !(all[end].key && all[end].number == 0)) ++end;
        std::vector<std::size_t> order(end - first);
        std::iota(order.begin(), order.end(), first);
        std::stable_sort(order.begin(), order.end(),
                         [&all](std::size_t a, std::size_t b) { return all[a].number < all[b].number; });
        for (std::size_t i = 0; i < order.size(); ++i)
            places[order[i]] = static_cast<long long>(first) + static_cast<long long>(i);
        first = end;
    }
}

// A picture that others refer to is shown after those between.
void placeByKind(const std::vector<Coded>& all, std::vector<long long>& places) {
    long long next = 0;
    std::size_t waiting = all.size();
    for (std::size_t i = 0; i < all.size(); ++i) {
        if (all[i].between) {
            places[i] = next++;
            continue;
        }
        if (waiting < all.size()) places[waiting] = next++;
        waiting = i;
    }
    if (waiting < all.size()) places[waiting] = next;
}

}  // namespace

bool shownOrder(MediaInput& input, int stream, ShownOrder& order, std::string& problem) {
    const AVCodecParameters& is = *input.context().streams[stream]->codecpar;
    const CodecPtr context(avcodec_alloc_context3(nullptr));
    const std::unique_ptr<AVCodecParserContext, FreeParser> parser(av_parser_init(is.codec_id));
    const PacketPtr packet(av_packet_alloc());
    if (!context || !packet || avcodec_parameters_to_context(context.get(), &is) < 0) {
        problem = "out of memory";
        return false;
    }
    if (parser) parser->flags |= PARSER_FLAG_COMPLETE_FRAMES;
    std::vector<Coded> all;
    MediaInput::Read read;
    while ((read = input.read(*packet)) == MediaInput::Read::packet) {
        Coded coded{static_cast<int>(all.size()), (packet->flags & AV_PKT_FLAG_KEY) != 0, false};
        if (parser) {
            std::uint8_t* data = nullptr;
            int bytes = 0;
            av_parser_parse2(parser.get(), context.get(), &data, &bytes, packet->data, packet->size,
                             AV_NOPTS_VALUE, AV_NOPTS_VALUE, 0);
            coded.number = parser->output_picture_number;
            coded.between = parser->pict_type == AV_PICTURE_TYPE_B;
        }
        if (packet->stream_index == stream) all.push_back(coded);
        av_packet_unref(packet.get());
    }
    if (read == MediaInput::Read::failed || !input.rewind()) {
        problem = input.failure();
        return false;
    }
    order.places.resize(all.size());
    if (is.codec_id == AV_CODEC_ID_H264 || is.codec_id == AV_CODEC_ID_HEVC)
        placeByNumber(all, order.places);
    else
        placeByKind(all, order.places);
    for (std::size_t i = 0; i < all.size(); ++i)
        order.delay = std::max(order.delay, static_cast<int>(static_cast<long long>(i) - order.places[i]));
    return true;
}

}  // namespace av
