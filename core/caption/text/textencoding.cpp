#include "core/caption/text/textencoding_p.h"

#include <algorithm>
#include <memory>
#include <new>

#include <uchardet/uchardet.h>

#include "core/arch/platform.h"
#include "core/caption/text/qvtext.h"

namespace {

// Code pages for the names of uchardet. The standards of ISO and TIS are taken as the Windows pages that have
// their letters in the same places and more.
constexpr struct {
    std::string_view name;
    int codepage;
} names[] = {
    {"ASCII", QvText::utf8}, {"UTF-8", QvText::utf8}, {"BIG5", 950},          {"EUC-JP", 51932},
    {"EUC-KR", 949},         {"GB18030", 54936},      {"GB2312", 54936},      {"IBM775", 775},
    {"IBM850", 850},         {"IBM852", 852},         {"IBM855", 855},        {"IBM862", 862},
    {"IBM865", 865},         {"IBM866", 866},         {"ISO-2022-JP", 50220}, {"ISO-2022-KR", 50225},
    {"ISO-8859-1", 1252},    {"ISO-8859-10", 28600},  {"ISO-8859-11", 874},   {"ISO-8859-13", 28603},
    {"ISO-8859-15", 28605},  {"ISO-8859-2", 28592},   {"ISO-8859-3", 28593},  {"ISO-8859-4", 28594},
    {"ISO-8859-5", 28595},   {"ISO-8859-6", 28596},   {"ISO-8859-7", 28597},  {"ISO-8859-8", 1255},
    {"ISO-8859-9", 1254},    {"JOHAB", 1361},         {"KOI8-R", 20866},      {"KOI8-U", 21866},
    {"MAC-CYRILLIC", 10007}, {"SHIFT_JIS", 932},      {"TIS-620", 874},       {"UHC", 949},
    {"WINDOWS-1250", 1250},  {"WINDOWS-1251", 1251},  {"WINDOWS-1252", 1252}, {"WINDOWS-1253", 1253},
    {"WINDOWS-1254", 1254},  {"WINDOWS-1255", 1255},  {"WINDOWS-1256", 1256}, {"WINDOWS-1257", 1257},
    {"WINDOWS-1258", 1258},
};

struct DetectorDone {
    void operator()(uchardet_t detector) const { uchardet_delete(detector); }
};

constexpr std::size_t enough = 1 << 20;  // bytes

}  // namespace

TextEncoding guessEncoding(std::string_view bytes) {
    const std::unique_ptr<std::remove_pointer_t<uchardet_t>, DetectorDone> detector(uchardet_new());
    const std::string_view sample = bytes.substr(0, enough);
    if (uchardet_handle_data(detector.get(), sample.data(), sample.size()) != 0) throw std::bad_alloc();
    uchardet_data_end(detector.get());
    TextEncoding guess{-1, uchardet_get_charset(detector.get())};
    const auto* const row = std::find_if(std::begin(names), std::end(names),
                                         [&guess](const auto& known) { return known.name == guess.name; });
    if (row == std::end(names)) return guess;
    if (row->codepage == QvText::utf8 || qv_platform().hasCodepage(row->codepage))
        guess.encoding = row->codepage;
    return guess;
}

UnitOrder utf16Order(std::string_view bytes) {
    const std::size_t pairs = std::min(bytes.size(), enough) / 2;
    std::size_t first = 0, second = 0;  // zeros in the first and in the second byte of a unit
    for (std::size_t i = 0; i < pairs; ++i) {
        first += bytes[2 * i] == 0;
        second += bytes[2 * i + 1] == 0;
    }
    // Times and line ends alone are a good part of any subtitle file.
    constexpr std::size_t part = 10;
    if (second > pairs / part && first * part < second) return UnitOrder::little;
    if (first > pairs / part && second * part < first) return UnitOrder::big;
    return UnitOrder::none;
}
