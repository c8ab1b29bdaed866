#include "builtin/pipes/output/memberaddress.h"

#include <cstring>
#include <string_view>

#include "builtin/pipes/output/members/muxerplace.h"
#include "builtin/pipes/output/members/outputstreams.h"

namespace {

constexpr std::size_t mostDigits = 4;

// The number of a stream; nullopt for anything but 1 to 4 digits.
std::optional<int> parseNumber(std::string_view digits) {
    if (digits.empty() || digits.size() > mostDigits) return std::nullopt;
    int number = 0;
    for (const char digit : digits) {
        if (digit < '0' || digit > '9') return std::nullopt;
        number = number * 10 + (digit - '0');
    }
    return number;
}

}  // namespace

std::optional<MemberAddress> MemberAddress::parse(const char* name) {
    const char* slash = std::strchr(name, '/');
    const std::string_view head =
        slash ? std::string_view(name, static_cast<std::size_t>(slash - name)) : name;
    const char* rest = slash ? slash + 1 : nullptr;
    if (slash && head == "muxer") return MemberAddress{Member::muxer, 0, rest};
    if (slash && head == "sink") return MemberAddress{Member::sink, 0, rest};
    constexpr std::size_t kindLength = 5;  // of "video" and of "audio"
    const std::string_view kind = head.substr(0, kindLength);
    if (kind != "video" && kind != "audio") return std::nullopt;
    const auto nr = parseNumber(head.substr(kindLength));
    if (!nr) return std::nullopt;
    return MemberAddress{kind == "video" ? Member::video : Member::audio, *nr, rest};
}

QvCodec* MemberAddress::find(const OutputStreams& streams, const MuxerPlace& end) const {
    switch (member) {
        case Member::muxer: return end.muxer();
        case Member::sink: return end.sink();
        case Member::video: return streams.encoder(qvVideoStream, nr);
        case Member::audio: return streams.encoder(qvAudioStream, nr);
    }
    return nullptr;
}
