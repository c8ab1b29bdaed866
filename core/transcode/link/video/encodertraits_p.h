// What a video link asks of its encoder, once, at open.
#pragma once

#include <optional>
#include <vector>

class QvEncodePipe;

struct EncoderTraits {
    EncoderTraits() = default;
    EncoderTraits(const QvEncodePipe& pipe, int stream);

    // The pixel format to give to the encoder: its own choice, or the input's where the encoder takes it, or
    // the first that it takes.
    unsigned formatFor(unsigned input) const;

    int width = 0;                     // pixels, 0 when the encoder gives none
    int height = 0;                    // pixels
    int topBlankingLines = 0;          // lines of blanking that it wants on top
    std::optional<unsigned> selected;  // a FOURCC
    // FOURCCs in its order; an element that is no FOURCC is absent. Empty: it takes any.
    std::vector<std::optional<unsigned>> accepted;
};
