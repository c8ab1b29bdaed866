// --crop: which part of a picture is kept.
#include <charconv>

#include "tarsel/picture/overlays.h"
#include "tarsel/picture/sizes.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

constexpr int kLeast = 4;  // pixels that have to be left

std::string sizeText(int width, int height) { return std::to_string(width) + "x" + std::to_string(height); }

// "+20" and "-20" of "+20-20": the distance of a box from one edge or the other.
int takeOffset(std::string_view& rest, int room, const std::string& text) {
    int value = 0;
    const char* begin = rest.data() + 1;
    const auto [end, error] = std::from_chars(begin, rest.data() + rest.size(), value);
    if (rest.size() < 2 || (rest[0] != '+' && rest[0] != '-') || *begin == '-' || error != std::errc())
        throw failure(Msg::cropWrong, {"--crop", text});
    const bool fromEnd = rest[0] == '-';
    rest.remove_prefix(static_cast<size_t>(end - rest.data()));
    return fromEnd ? room - value : value;
}

// The largest box of an aspect, in the middle.
QvRect ofAspect(const std::string& text, size_t colon, const PictureFormat& picture) {
    const auto part = [](std::string_view digits) { return parseNumber(digits, 1, 10000, "--crop"); };
    const double wanted = static_cast<double>(part(std::string_view(text).substr(0, colon))) /
                          static_cast<double>(part(std::string_view(text).substr(colon + 1)));
    const QvRect box = partOfShape(wanted, picture);
    if (box.width() < kLeast || box.height() < kLeast) throw failure(Msg::cropEmpty, {text});
    return box;
}

void check(const std::string& text, const QvRect& box, const PictureFormat& picture) {
    const std::string of = sizeText(picture.width, picture.height);
    if (box.width() > picture.width || box.height() > picture.height || box.left() < 0 || box.top() < 0 ||
        box.right() > picture.width || box.bottom() > picture.height)
        throw failure(Msg::cropBeyond, {text, of});
    if (box.width() < kLeast || box.height() < kLeast) throw failure(Msg::cropEmpty, {text});
    const Grid grid = gridOf(picture);
    if (box.left() % grid.columns != 0 || box.width() % grid.columns != 0)
        throw failure(Msg::cropColumns, {text});
    if (box.top() % grid.rows != 0 || (grid.rows > 1 && box.height() % 2 != 0))
        throw failure(Msg::cropRows, {text, std::to_string(grid.rows)});
}

}  // namespace

QvRect parseCrop(const std::string& text, const PictureFormat& picture) {
    if (const size_t colon = text.find(':'); colon != std::string::npos)
        return ofAspect(text, colon, picture);
    const size_t signs = std::min(text.find_first_of("+-"), text.size());
    const Size size = parseSize(std::string_view(text).substr(0, signs), "--crop", 65535, Msg::cropWrong);
    const Grid grid = gridOf(picture);
    int x = (picture.width - size.width) / 2 / grid.columns * grid.columns;
    int y = (picture.height - size.height) / 2 / grid.rows * grid.rows;
    if (std::string_view rest = std::string_view(text).substr(signs); !rest.empty()) {
        x = takeOffset(rest, picture.width - size.width, text);
        if (rest.empty()) throw failure(Msg::cropWrong, {"--crop", text});
        y = takeOffset(rest, picture.height - size.height, text);
        if (!rest.empty()) throw failure(Msg::cropWrong, {"--crop", text});
    }
    const QvRect box(x, y, x + size.width, y + size.height);
    check(text, box, picture);
    return box;
}
