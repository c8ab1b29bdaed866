#include <iconv.h>
#include <algorithm>
#include <array>
#include <cerrno>
#include <iterator>

#include "core/arch/platform.h"

namespace {

// What iconv calls the code pages. Numbers that are not here have the name "CP" and the number.
struct IconvName {
    int number;
    const char* name;
};
constexpr IconvName iconvNames[] = {
    {874, "CP874"},         {1200, "UTF-16LE"},     {1201, "UTF-16BE"},     {10000, "MACINTOSH"},
    {12000, "UTF-32LE"},    {12001, "UTF-32BE"},    {20127, "US-ASCII"},    {20866, "KOI8-R"},
    {20932, "EUC-JP"},      {20936, "GB2312"},      {21866, "KOI8-U"},      {28591, "ISO-8859-1"},
    {28592, "ISO-8859-2"},  {28593, "ISO-8859-3"},  {28594, "ISO-8859-4"},  {28595, "ISO-8859-5"},
    {28596, "ISO-8859-6"},  {28597, "ISO-8859-7"},  {28598, "ISO-8859-8"},  {28599, "ISO-8859-9"},
    {28600, "ISO-8859-10"}, {28601, "ISO-8859-11"}, {28603, "ISO-8859-13"}, {28604, "ISO-8859-14"},
    {28605, "ISO-8859-15"}, {38598, "ISO-8859-8"},  {50220, "ISO-2022-JP"}, {50221, "ISO-2022-JP"},
    {50222, "ISO-2022-JP"}, {50225, "ISO-2022-KR"}, {51932, "EUC-JP"},      {51936, "GB2312"},
    {51949, "EUC-KR"},      {54936, "GB18030"},     {65000, "UTF-7"},       {65001, "UTF-8"},
};

constexpr bool isSorted(const auto& rows) {
    return std::is_sorted(std::begin(rows), std::end(rows),
                          [](const auto& a, const auto& b) { return a.number < b.number; });
}
static_assert(isSorted(iconvNames));

std::string iconvName(int number) {
    const auto* const row =
        std::lower_bound(std::begin(iconvNames), std::end(iconvNames), number,
                         [](const IconvName& name, int wanted) { return name.number < wanted; });
    const bool known = row != std::end(iconvNames) && row->number == number;
    return known ? row->name : "CP" + std::to_string(number);
}

class Converter {
  public:
    explicit Converter(int number) : handle_(iconv_open("UTF-32LE", iconvName(number).c_str())) {}
    Converter(const Converter&) = delete;
    Converter& operator=(const Converter&) = delete;
    ~Converter() {
        if (isOpen()) iconv_close(handle_);
    }

    bool isOpen() const { return handle_ != reinterpret_cast<iconv_t>(-1); }

    void convert(std::string_view bytes, std::u32string& text) {
        char* from = const_cast<char*>(bytes.data());
        std::size_t left = bytes.size();
        while (left > 0) {
            if (step(&from, &left, text)) continue;
            text.push_back(U'\uFFFD');
            ++from;
            --left;
            iconv(handle_, nullptr, nullptr, nullptr, nullptr);
        }
        step(nullptr, nullptr, text);  // what a converter with states still holds
    }

  private:
    // False at bytes that can't be converted, or that end within a character.
    bool step(char** from, std::size_t* left, std::u32string& text) {
        std::array<unsigned char, 4096> block;
        char* to = reinterpret_cast<char*>(block.data());
        std::size_t room = block.size();
        const bool whole = iconv(handle_, from, left, &to, &room) != static_cast<std::size_t>(-1);
        const bool full = !whole && errno == E2BIG;
        for (std::size_t i = 0; i + 3 < block.size() - room; i += 4)
            text.push_back(static_cast<char32_t>(block[i]) | static_cast<char32_t>(block[i + 1]) << 8 |
                           static_cast<char32_t>(block[i + 2]) << 16 |
                           static_cast<char32_t>(block[i + 3]) << 24);
        return whole || full;
    }

    iconv_t handle_;
};

}  // namespace

bool QvPlatform::hasCodepage(int number) { return number > 0 && Converter(number).isOpen(); }

bool QvPlatform::decodeCodepage(int number, std::string_view bytes, std::u32string& text) {
    if (number <= 0) return false;
    Converter converter(number);
    if (!converter.isOpen()) return false;
    converter.convert(bytes, text);
    return true;
}
