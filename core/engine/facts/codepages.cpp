#include "core/engine/facts/codepages.h"

#include <algorithm>
#include <iterator>

#include "core/arch/platform.h"

namespace {

struct Row {
    int number;
    QvCodepageName text;
};

// In rising order of the numbers.
constexpr Row rows[] = {
    {37, {"IBM EBCDIC US-Canada", "IBM037"}},
    {437, {"OEM United States", "IBM437"}},
    {500, {"IBM EBCDIC International", "IBM500"}},
    {708, {"Arabic (ASMO 708)", "ASMO-708"}},
    {709, {"Arabic (ASMO-449+, BCON V4)", ""}},
    {710, {"Arabic - Transparent Arabic", ""}},
    {720, {"Arabic (Transparent ASMO); Arabic (DOS)", "DOS-720"}},
    {737, {"OEM Greek (formerly 437G); Greek (DOS)", "ibm737"}},
    {775, {"OEM Baltic; Baltic (DOS)", "ibm775"}},
    {850, {"OEM Multilingual Latin 1; Western European (DOS)", "ibm850"}},
    {852, {"OEM Latin 2; Central European (DOS)", "ibm852"}},
    {855, {"OEM Cyrillic (primarily Russian)", "IBM855"}},
    {857, {"OEM Turkish; Turkish (DOS)", "ibm857"}},
    {858, {"OEM Multilingual Latin 1 + Euro symbol", "IBM00858"}},
    {860, {"OEM Portuguese; Portuguese (DOS)", "IBM860"}},
    {861, {"OEM Icelandic; Icelandic (DOS)", "ibm861"}},
    {862, {"OEM Hebrew; Hebrew (DOS)", "DOS-862"}},
    {863, {"OEM French Canadian; French Canadian (DOS)", "IBM863"}},
    {864, {"OEM Arabic; Arabic (864)", "IBM864"}},
    {865, {"OEM Nordic; Nordic (DOS)", "IBM865"}},
    {866, {"OEM Russian; Cyrillic (DOS)", "cp866"}},
    {869, {"OEM Modern Greek; Greek, Modern (DOS)", "ibm869"}},
    {870, {"IBM EBCDIC Multilingual/ROECE (Latin 2); IBM EBCDIC Multilingual Latin 2", "IBM870"}},
    {874, {"Thai (Windows)", "windows-874"}},
    {875, {"IBM EBCDIC Greek Modern", "cp875"}},
    {932, {"Japanese; Japanese (Shift-JIS)", "shift_jis"}},
    {936, {"Simplified Chinese (PRC, Singapore); Chinese Simplified (GB2312)", "gb2312"}},
    {949, {"Korean (Unified Hangul Code)", "ks_c_5601-1987"}},
    {950, {"Traditional Chinese (Taiwan; Hong Kong SAR, PRC); Chinese Traditional (Big5)", "big5"}},
    {1026, {"IBM EBCDIC Turkish (Latin 5)", "IBM1026"}},
    {1047, {"IBM EBCDIC Latin 1/Open System", "IBM01047"}},
    {1140, {"IBM EBCDIC US-Canada (037 + Euro symbol); IBM EBCDIC (US-Canada-Euro)", "IBM01140"}},
    {1141, {"IBM EBCDIC Germany (20273 + Euro symbol); IBM EBCDIC (Germany-Euro)", "IBM01141"}},
    {1142, {"IBM EBCDIC Denmark-Norway (20277 + Euro symbol); IBM EBCDIC (Denmark-Norway-Euro)", "IBM01142"}},
    {1143, {"IBM EBCDIC Finland-Sweden (20278 + Euro symbol); IBM EBCDIC (Finland-Sweden-Euro)", "IBM01143"}},
    {1144, {"IBM EBCDIC Italy (20280 + Euro symbol); IBM EBCDIC (Italy-Euro)", "IBM01144"}},
    {1145, {"IBM EBCDIC Latin America-Spain (20284 + Euro symbol); IBM EBCDIC (Spain-Euro)", "IBM01145"}},
    {1146, {"IBM EBCDIC United Kingdom (20285 + Euro symbol); IBM EBCDIC (UK-Euro)", "IBM01146"}},
    {1147, {"IBM EBCDIC France (20297 + Euro symbol); IBM EBCDIC (France-Euro)", "IBM01147"}},
    {1148, {"IBM EBCDIC International (500 + Euro symbol); IBM EBCDIC (International-Euro)", "IBM01148"}},
    {1149, {"IBM EBCDIC Icelandic (20871 + Euro symbol); IBM EBCDIC (Icelandic-Euro)", "IBM01149"}},
    {1200, {"Unicode UTF-16, little endian byte order", "utf-16"}},
    {1201, {"Unicode UTF-16, big endian byte order", "unicodeFFFE"}},
    {1250, {"Central European; Central European (Windows)", "windows-1250"}},
    {1251, {"Cyrillic; Cyrillic (Windows)", "windows-1251"}},
    {1252, {"Latin 1; Western European (Windows)", "windows-1252"}},
    {1253, {"Greek; Greek (Windows)", "windows-1253"}},
    {1254, {"Turkish; Turkish (Windows)", "windows-1254"}},
    {1255, {"Hebrew; Hebrew (Windows)", "windows-1255"}},
    {1256, {"Arabic; Arabic (Windows)", "windows-1256"}},
    {1257, {"Baltic; Baltic (Windows)", "windows-1257"}},
    {1258, {"Vietnamese; Vietnamese (Windows)", "windows-1258"}},
    {1361, {"Korean (Johab)", "Johab"}},
    {10000, {"MAC Roman; Western European (Mac)", "macintosh"}},
    {10001, {"Japanese (Mac)", "x-mac-japanese"}},
    {10002, {"MAC Traditional Chinese (Big5); Chinese Traditional (Mac)", "x-mac-chinesetrad"}},
    {10003, {"Korean (Mac)", "x-mac-korean"}},
    {10004, {"Arabic (Mac)", "x-mac-arabic"}},
    {10005, {"Hebrew (Mac)", "x-mac-hebrew"}},
    {10006, {"Greek (Mac)", "x-mac-greek"}},
    {10007, {"Cyrillic (Mac)", "x-mac-cyrillic"}},
    {10008, {"MAC Simplified Chinese (GB 2312); Chinese Simplified (Mac)", "x-mac-chinesesimp"}},
    {10010, {"Romanian (Mac)", "x-mac-romanian"}},
    {10017, {"Ukrainian (Mac)", "x-mac-ukrainian"}},
    {10021, {"Thai (Mac)", "x-mac-thai"}},
    {10029, {"MAC Latin 2; Central European (Mac)", "x-mac-ce"}},
    {10079, {"Icelandic (Mac)", "x-mac-icelandic"}},
    {10081, {"Turkish (Mac)", "x-mac-turkish"}},
    {10082, {"Croatian (Mac)", "x-mac-croatian"}},
    {12000, {"Unicode UTF-32, little endian byte order", "utf-32"}},
    {12001, {"Unicode UTF-32, big endian byte order", "utf-32BE"}},
    {20000, {"CNS Taiwan; Chinese Traditional (CNS)", "x-Chinese_CNS"}},
    {20001, {"TCA Taiwan", "x-cp20001"}},
    {20002, {"Eten Taiwan; Chinese Traditional (Eten)", "x-Chinese-Eten"}},
    {20003, {"IBM5550 Taiwan", "x-cp20003"}},
    {20004, {"TeleText Taiwan", "x-cp20004"}},
    {20005, {"Wang Taiwan", "x-cp20005"}},
    {20105, {"IA5 (IRV International Alphabet No. 5, 7-bit); Western European (IA5)", "x-IA5"}},
    {20106, {"IA5 German (7-bit)", "x-IA5-German"}},
    {20107, {"IA5 Swedish (7-bit)", "x-IA5-Swedish"}},
    {20108, {"IA5 Norwegian (7-bit)", "x-IA5-Norwegian"}},
    {20127, {"US-ASCII (7-bit)", "us-ascii"}},
    {20261, {"T.61", "x-cp20261"}},
    {20269, {"ISO 6937 Non-Spacing Accent", "x-cp20269"}},
    {20273, {"IBM EBCDIC Germany", "IBM273"}},
    {20277, {"IBM EBCDIC Denmark-Norway", "IBM277"}},
    {20278, {"IBM EBCDIC Finland-Sweden", "IBM278"}},
    {20280, {"IBM EBCDIC Italy", "IBM280"}},
    {20284, {"IBM EBCDIC Latin America-Spain", "IBM284"}},
    {20285, {"IBM EBCDIC United Kingdom", "IBM285"}},
    {20290, {"IBM EBCDIC Japanese Katakana Extended", "IBM290"}},
    {20297, {"IBM EBCDIC France", "IBM297"}},
    {20420, {"IBM EBCDIC Arabic", "IBM420"}},
    {20423, {"IBM EBCDIC Greek", "IBM423"}},
    {20424, {"IBM EBCDIC Hebrew", "IBM424"}},
    {20833, {"IBM EBCDIC Korean Extended", "x-EBCDIC-KoreanExtended"}},
    {20838, {"IBM EBCDIC Thai", "IBM-Thai"}},
    {20866, {"Russian (KOI8-R); Cyrillic (KOI8-R)", "koi8-r"}},
    {20871, {"IBM EBCDIC Icelandic", "IBM871"}},
    {20880, {"IBM EBCDIC Cyrillic Russian", "IBM880"}},
    {20905, {"IBM EBCDIC Turkish", "IBM905"}},
    {20924, {"IBM EBCDIC Latin 1/Open System (1047 + Euro symbol)", "IBM00924"}},
    {20932, {"Japanese (JIS 0208-1990 and 0212-1990)", "EUC-JP"}},
    {20936, {"Simplified Chinese (GB2312); Chinese Simplified (GB2312-80)", "x-cp20936"}},
    {20949, {"Korean Wansung", "x-cp20949"}},
    {21025, {"IBM EBCDIC Cyrillic Serbian-Bulgarian", "cp1025"}},
    {21866, {"Ukrainian (KOI8-U); Cyrillic (KOI8-U)", "koi8-u"}},
    {28591, {"ISO 8859-1 Latin 1; Western European (ISO)", "iso-8859-1"}},
    {28592, {"ISO 8859-2 Central European; Central European (ISO)", "iso-8859-2"}},
    {28593, {"ISO 8859-3 Latin 3", "iso-8859-3"}},
    {28594, {"ISO 8859-4 Baltic", "iso-8859-4"}},
    {28595, {"ISO 8859-5 Cyrillic", "iso-8859-5"}},
    {28596, {"ISO 8859-6 Arabic", "iso-8859-6"}},
    {28597, {"ISO 8859-7 Greek", "iso-8859-7"}},
    {28598, {"ISO 8859-8 Hebrew; Hebrew (ISO-Visual)", "iso-8859-8"}},
    {28599, {"ISO 8859-9 Turkish", "iso-8859-9"}},
    {28600, {"ISO 8859-10 Nordic", "iso-8859-10"}},
    {28601, {"ISO 8859-11 Thai", "iso-8859-11"}},
    {28603, {"ISO 8859-13 Estonian", "iso-8859-13"}},
    {28604, {"ISO 8859-14 Celtic", "iso-8859-14"}},
    {28605, {"ISO 8859-15 Latin 9", "iso-8859-15"}},
    {29001, {"Europa 3", "x-Europa"}},
    {38598, {"ISO 8859-8 Hebrew; Hebrew (ISO-Logical)", "iso-8859-8-i"}},
    {50220, {"ISO 2022 Japanese with no halfwidth Katakana; Japanese (JIS)", "iso-2022-jp"}},
    {50221, {"ISO 2022 Japanese with halfwidth Katakana; Japanese (JIS-Allow 1 byte Kana)", "csISO2022JP"}},
    {50222, {"ISO 2022 Japanese JIS X 0201-1989; Japanese (JIS-Allow 1 byte Kana - SO/SI)", "iso-2022-jp"}},
    {50225, {"ISO 2022 Korean", "iso-2022-kr"}},
    {50227, {"ISO 2022 Simplified Chinese; Chinese Simplified (ISO 2022)", "x-cp50227"}},
    {50229, {"ISO 2022 Traditional Chinese", ""}},
    {50930, {"EBCDIC Japanese (Katakana) Extended", ""}},
    {50931, {"EBCDIC US-Canada and Japanese", ""}},
    {50933, {"EBCDIC Korean Extended and Korean", ""}},
    {50935, {"EBCDIC Simplified Chinese Extended and Simplified Chinese", ""}},
    {50936, {"EBCDIC Simplified Chinese", ""}},
    {50937, {"EBCDIC US-Canada and Traditional Chinese", ""}},
    {50939, {"EBCDIC Japanese (Latin) Extended and Japanese", ""}},
    {51932, {"EUC Japanese", "euc-jp"}},
    {51936, {"EUC Simplified Chinese; Chinese Simplified (EUC)", "EUC-CN"}},
    {51949, {"EUC Korean", "euc-kr"}},
    {51950, {"EUC Traditional Chinese", ""}},
    {52936, {"HZ-GB2312 Simplified Chinese; Chinese Simplified (HZ)", "hz-gb-2312"}},
    {54936, {"GB18030 Simplified Chinese (4 byte); Chinese Simplified (GB18030)", "GB18030"}},
    {65000, {"Unicode (UTF-7)", "utf-7"}},
    {65001, {"Unicode (UTF-8)", "utf-8"}},
};

constexpr bool before(const Row& a, const Row& b) { return a.number < b.number; }
static_assert(std::is_sorted(std::begin(rows), std::end(rows), before));

// The pages that text files come in, in rising order; each range ends with its last number.
struct Range {
    int first, last;
};
constexpr Range offered[] = {
    {874, 874},     {932, 932},     {936, 936},     {949, 950},     {1250, 1258},
    {20866, 20866}, {20932, 20932}, {20936, 20936}, {21866, 21866}, {28591, 28605},
    {38598, 38598}, {50220, 50220}, {51932, 51932}, {51949, 51949},
};

AnyVector listInstalled() {
    AnyVector list;
    for (const Range& range : offered) {
        for (int number = range.first; number <= range.last; ++number) {
            if (!qv_platform().hasCodepage(number)) continue;
            AnyDict entry;
            entry.set("identifier", Any(number));
            entry.set("name", Any(codepage_name(number).name));
            list.append(entry);
        }
    }
    return list;
}

}  // namespace

QvCodepageName codepage_name(int number) {
    const Row wanted{number, {}};
    const Row* const row = std::lower_bound(std::begin(rows), std::end(rows), wanted, before);
    return row != std::end(rows) && row->number == number ? row->text : QvCodepageName{"", ""};
}

int available_codepages(AnyVector& out) {
    static const AnyVector installed = listInstalled();
    out = installed;
    return 0;
}
