#include "core/caption/cc/cccharacters_p.h"

#include <array>
#include <string>
#include <unordered_map>

#include "core/value/utf.h"

namespace {

using Characters16 = std::array<std::string_view, 16>;
using Characters32 = std::array<std::string_view, 32>;

constexpr Characters16 specialCharacters = {"®", "°", "½", "¿", "™", "¢", "£", "♪",
                                            "à", " ", "è", "â", "ê", "î", "ô", "û"};
// 0x12: Spanish, miscellaneous, French.
constexpr Characters32 westCharacters = {"Á", "É", "Ó", "Ú", "Ü", "ü", "‘", "¡", "*", "'", "—",
                                         "©", "℠", "•", "“", "”", "À", "Â", "Ç", "È", "Ê", "Ë",
                                         "ë", "Î", "Ï", "ï", "Ô", "Ù", "ù", "Û", "«", "»"};
// 0x13: Portuguese, German, Danish. The pipe of 0x2E is broken, as "|" parts rows.
constexpr Characters32 northCharacters = {"Ã",  "ã", "Í", "Ì", "ì", "Ò", "ò", "Õ", "õ", "{", "}",
                                          "\\", "^", "_", "¦", "~", "Ä", "ä", "Ö", "ö", "ß", "¥",
                                          "¤",  "│", "Å", "å", "Ø", "ø", "┌", "┐", "└", "┘"};

// The basic characters that receivers show which don't know the extended ones.
constexpr std::string_view westFallbacks = "AEOUUu'!''-cs.\"\"AACEEEeIIiOUuU<>";
constexpr std::string_view northFallbacks = "AaIIiOoOo()/'-/-AaOosY$/AaOo++++";

static_assert(westFallbacks.size() == 32 && northFallbacks.size() == 32);

constexpr std::string_view ascii =
    " !\"#$%&'()*+,-./0123456789:;<=>?@ABCDEFGHIJKLMNOPQRSTUVWXYZ[\\]^_`abcdefghijklmnopqrstuvwxyz{|}~\x7F";

std::string_view differing(int code) {
    switch (code) {
        case 0x27: return "’";
        case 0x2A: return "á";
        case 0x5C: return "é";
        case 0x5E: return "í";
        case 0x5F: return "ó";
        case 0x60: return "ú";
        case 0x7B: return "ç";
        case 0x7C: return "÷";
        case 0x7D: return "Ñ";
        case 0x7E: return "ñ";
        case 0x7F: return "█";
        default: return {};
    }
}

char32_t single(std::string_view text) {
    size_t position = 0;
    return QvUtf::next(text, position);
}

// The other way round, made with the first use. What has several codes has the shortest.
class Codes {
  public:
    Codes() {
        for (int code = 0x20; code < 0x80; ++code) add(qvCcBasicCharacter(code), {0, code, 0});
        add("'", codes_.at(single("’")));  // as everyone writes it
        for (int code = 0x30; code < 0x40; ++code) add(qvCcSpecialCharacter(code), {0x11, code, 0});
        for (int i = 0; i < 32; ++i) {
            const auto index = static_cast<size_t>(i);
            add(westCharacters[index], {0x12, 0x20 + i, westFallbacks[index]});
            add(northCharacters[index], {0x13, 0x20 + i, northFallbacks[index]});
        }
        add("|", codes_.at(single("¦")));
        add("\u00A0", codes_.at(' '));
        add("―", codes_.at(single("—")));
        add("–", codes_.at('-'));
        add("‚", codes_.at(','));
        add("ʼ", codes_.at(single("’")));
        add("♫", codes_.at(single("♪")));
    }
    std::optional<QvCcCode> find(char32_t character) const {
        const auto found = codes_.find(character);
        return found == codes_.end() ? std::nullopt : std::optional(found->second);
    }

  private:
    void add(std::string_view character, QvCcCode code) { codes_.emplace(single(character), code); }

    std::unordered_map<char32_t, QvCcCode> codes_;
};

}  // namespace

std::string_view qvCcBasicCharacter(int code) {
    const std::string_view other = differing(code);
    return other.empty() ? ascii.substr(static_cast<size_t>(code - 0x20), 1) : other;
}

std::string_view qvCcSpecialCharacter(int code) { return specialCharacters[static_cast<size_t>(code & 0xF)]; }

std::string_view qvCcExtendedCharacter(int first, int code) {
    return (first == 0x12 ? westCharacters : northCharacters)[static_cast<size_t>(code & 0x1F)];
}

std::optional<QvCcCode> qvCcCodeOf(char32_t character) {
    static const Codes codes;
    return codes.find(character);
}
