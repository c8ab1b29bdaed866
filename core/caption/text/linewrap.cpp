#include "core/caption/text/linewrap_p.h"

#include <algorithm>
#include <memory>

#include <linebreak.h>

#include "core/caption/text/styledtext_p.h"

namespace {

// What is not broken, with the blanks after it.
struct Piece {
    std::size_t begin;
    std::size_t end;
    long long width = 0;    // all of it
    long long visible = 0;  // up to the blanks
};

bool isBlank(char32_t c) { return c == U' ' || c == 0x3000 || (c >= 0x2000 && c <= 0x200B && c != 0x2007); }

// For each character whether the text can be broken after it.
std::vector<char> breaksOf(std::u32string_view text) {
    static const bool ready = (init_linebreak(), true);
    static_cast<void>(ready);
    static_assert(sizeof(utf32_t) == sizeof(char32_t));
    const std::vector<utf32_t> characters(text.begin(), text.end());
    std::vector<char> breaks(text.size());
    set_linebreaks_utf32(characters.data(), characters.size(), "", breaks.data());
    return breaks;
}

class Pieces {
  public:
    Pieces(std::u32string_view text, std::span<const long long> advances, long long widest)
        : text_(text), advances_(advances), widest_(widest) {}

    std::vector<Piece> all() {
        const auto breaks = breaksOf(text_);
        for (std::size_t begin = 0, at = 0; at < text_.size(); ++at) {
            if (at + 1 < text_.size() && breaks[at] != LINEBREAK_ALLOWBREAK &&
                breaks[at] != LINEBREAK_MUSTBREAK)
                continue;
            add(begin, at + 1);
            begin = at + 1;
        }
        return std::move(pieces_);
    }

  private:
    // A word wider than a line becomes several pieces.
    void add(std::size_t begin, std::size_t end) {
        Piece piece{begin, begin};
        while (piece.end < end) {
            std::size_t next = piece.end + 1;
            while (next < end && extendsCluster(text_[next])) ++next;
            long long width = 0;
            for (std::size_t i = piece.end; i < next; ++i) width += advances_[i];
            const bool blank = isBlank(text_[piece.end]);
            if (!blank && piece.end > piece.begin && piece.width + width > widest_) {
                pieces_.push_back(piece);
                piece = {piece.end, piece.end};
            }
            piece.end = next;
            piece.width += width;
            if (!blank) piece.visible = piece.width;
        }
        pieces_.push_back(piece);
    }

    std::u32string_view text_;
    std::span<const long long> advances_;
    long long widest_;
    std::vector<Piece> pieces_;
};

// The pieces that begin a line, if each line takes as many as fit.
std::vector<std::size_t> filled(const std::vector<Piece>& pieces, long long widest) {
    std::vector<std::size_t> starts;
    long long width = 0;
    for (std::size_t i = 0; i < pieces.size(); ++i) {
        if (i == 0 || width + pieces[i].visible > widest) {
            starts.push_back(i);
            width = 0;
        }
        width += pieces[i].width;
    }
    return starts;
}

// The smallest width at which the number of lines stays the same.
std::vector<std::size_t> balanced(const std::vector<Piece>& pieces, long long widest) {
    auto starts = filled(pieces, widest);
    long long low = 0, high = widest;  // high is enough, low is not
    while (starts.size() > 1 && high - low > 1) {
        const long long middle = low + (high - low) / 2;
        auto tried = filled(pieces, middle);
        if (tried.size() <= starts.size()) {
            starts = std::move(tried);
            high = middle;
        } else {
            low = middle;
        }
    }
    return starts;
}

}  // namespace

std::vector<LinePart> wrapLine(std::u32string_view text, std::span<const long long> advances,
                               long long widest) {
    const auto pieces = Pieces(text, advances, widest).all();
    const auto starts = balanced(pieces, widest);
    std::vector<LinePart> parts;
    for (std::size_t i = 0; i < starts.size(); ++i) {
        LinePart part{pieces[starts[i]].begin,
                      i + 1 < starts.size() ? pieces[starts[i + 1]].begin : text.size()};
        while (part.begin < part.end && isBlank(text[part.begin])) ++part.begin;
        while (part.begin < part.end && isBlank(text[part.end - 1])) --part.end;
        if (part.begin < part.end) parts.push_back(part);
    }
    return parts;
}
