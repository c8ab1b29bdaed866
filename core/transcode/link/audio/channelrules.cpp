#include <iterator>

#include "core/transcode/link/audio/channelrules_p.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

namespace qvchannels {

namespace {

using Connections = std::vector<Connection>;

Connections straight(int count) {
    Connections list;
    for (int i = 0; i < count; ++i) list.push_back({i, i});
    return list;
}

// The first three channels, left, right and centre, mixed into one.
Connections frontToOne() { return {{0, 0}, {1, 0}, {2, 0}}; }

// Left and right straight, centre on both sides.
Connections centreOnBoth() { return {{0, 0}, {1, 1}, {2, 0}, {2, 1}}; }

Connections byDefault(int in, int out) {
    if (in == 2 && out == 1) return {{0, 0}, {1, 0}};
    if (in == 1 && out == 2) return {{0, 0}, {0, 1}};
    if (out >= in) return straight(in);
    Connections list;
    for (int i = 0; i < in && out > 0; ++i) list.push_back({i, i % out});
    return list;
}

// --- Dolby sources give the position of each speaker.

enum Speaker { L, R, C, Ls, Rs, SUB, nrSpeakers };

constexpr const char* speakerNames[] = {"L", "R", "C", "Ls", "Rs", "SUB"};
static_assert(std::size(speakerNames) == nrSpeakers);

struct Place {
    Speaker speaker;
    int out;
};

constexpr Place dolby3[] = {{L, 0}, {C, 1}, {R, 2}};
constexpr Place dolby4[] = {
    {L, 0}, {C, 1}, {R, 2}, {Ls, 4}};  // output 4 of 4 is refused, output 3 stays empty
constexpr Place dolby5[] = {{L, 0}, {C, 1}, {R, 2}, {Ls, 3}, {Rs, 4}};
constexpr Place aac3[] = {{L, 0}, {R, 1}, {C, 2}};
constexpr Place aac4[] = {{L, 0}, {R, 1}, {C, 2}, {Ls, 3}, {Rs, 3}};
constexpr Place aac5[] = {{L, 0}, {R, 1}, {C, 2}, {Ls, 3}, {Rs, 4}};
constexpr Place any1[] = {{L, 0}, {R, 0}, {C, 0}};
constexpr Place any2[] = {{L, 0}, {R, 1}, {C, 0}, {C, 1}};
constexpr Place any6[] = {{L, 0}, {R, 1}, {C, 2}, {SUB, 3}, {Ls, 4}, {Rs, 5}};

struct Places {
    const Place* begin = nullptr;
    const Place* end = nullptr;
};

template <std::size_t N>
constexpr Places all(const Place (&places)[N]) {
    return {places, places + N};
}

Places dolbyPlaces(CodecFamily target, int out) {
    if (out == 1) return all(any1);
    if (out == 2) return all(any2);
    if (target != CodecFamily::dolby && target != CodecFamily::aac) return {};
    const bool dolby = target == CodecFamily::dolby;
    switch (out) {
        case 3: return dolby ? all(dolby3) : all(aac3);
        case 4: return dolby ? all(dolby4) : all(aac4);
        case 5: return dolby ? all(dolby5) : all(aac5);
        case 6: return all(any6);
        default: return {};
    }
}

Connections fromDolby(const Layout& layout, CodecFamily target) {
    const Places places = dolbyPlaces(target, layout.outChannels);
    if (!places.begin) return byDefault(layout.inChannels, layout.outChannels);
    Connections list;
    for (const auto* place = places.begin; place != places.end; ++place) {
        const int position = layout.dolby->getInt32(speakerNames[place->speaker], -1);
        if (position >= 0 && position < layout.inChannels) list.push_back({position, place->out});
    }
    return list;
}

// --- AAC sources: left, right, centre, then the surround channels.

Connections aacToDolby(int in, int out) {
    const Connections frontSwapped = {{0, 0}, {1, 2}, {2, 1}};  // the target has the centre second
    Connections list;
    if (in == 1 && (out == 5 || out == 6)) return {{0, 0}, {0, 1}, {0, 2}};
    if (in == 2 && out == 5) return {{0, 0}, {1, 2}};
    if (in == 2 && out == 6) return straight(2);
    if (in >= 3 && in <= 6 && out == 1) return frontToOne();
    if (in >= 3 && in <= 6 && out == 2) return centreOnBoth();
    if (in >= 3 && in <= 6 && out == 5) {
        list = frontSwapped;
        if (in == 4) list.insert(list.end(), {{3, 3}, {3, 4}});
        if (in >= 5) list.insert(list.end(), {{3, 3}, {4, 4}});
        return list;
    }
    if (in >= 3 && in <= 6 && out == 6) {
        if (in != 4) return straight(in);
        list = straight(3);
        list.insert(list.end(), {{3, 4}, {3, 5}});
        return list;
    }
    return byDefault(in, out);
}

Connections aacToAac(int in, int out) {
    if (in == 1 && out >= 3) return {{0, 2}};
    if (in == 2 && out >= 3 && out <= 6) return straight(2);
    if (in >= 3 && in <= 6 && out < in) {
        if (out == 1) return frontToOne();
        if (out == 2) return centreOnBoth();
        if (out == 3) return straight(3);
        if (out == 4) return {{0, 0}, {1, 1}, {2, 2}, {3, 3}, {4, 3}};
        if (out == 5) return straight(5);
    }
    if (in == 4 && (out == 5 || out == 6)) return {{0, 0}, {1, 1}, {2, 2}, {3, 3}, {3, 4}};
    return byDefault(in, out);
}

Connections aacToOther(int in, int out) {
    if (out == 1) {
        Connections list;
        for (int i = 0; i < in; ++i) list.push_back({i, 0});
        return list;
    }
    if (out == 2) {
        if (in == 1) return {{0, 0}, {0, 1}};
        return in == 2 ? straight(2) : centreOnBoth();
    }
    return byDefault(in, out);
}

Connections otherToDolby(int in, int out) {
    if (in == 1) return {{0, 0}};
    if (in == 2 && out == 5) return {{0, 0}, {0, 1}, {1, 2}, {1, 1}};
    if (in == 2 && out == 6) return {{0, 0}, {0, 2}, {1, 1}, {1, 2}};
    return byDefault(in, out);
}

}  // namespace

std::vector<Connection> connections(const Layout& layout) {
    const int in = layout.inChannels;
    const int out = layout.outChannels;
    const CodecFamily target = layout.target;
    if (layout.codec == "AAC") {
        if (target == CodecFamily::dolby) return aacToDolby(in, out);
        return target == CodecFamily::aac ? aacToAac(in, out) : aacToOther(in, out);
    }
    if (layout.codec == "Dolby") return layout.dolby ? fromDolby(layout, target) : byDefault(in, out);
    return target == CodecFamily::dolby ? otherToDolby(in, out) : byDefault(in, out);
}

}  // namespace qvchannels
