#include "core/caption/subtitle/subtitlecopy_p.h"

#include <algorithm>
#include <string>

#include "core/caption/subtitle/qvsubtitles.h"
#include "core/caption/subtitle/subtitletext_p.h"
#include "core/caption/text/qvtext.h"
#include "core/caption/text/textencoding_p.h"
#include "core/value/utf.h"

namespace {

using Findings = QvSubtitleFindings;

constexpr const char* unicodeNames[] = {"UTF-8", "UTF-16BE", "UTF-16LE", "UTF-32BE", "UTF-32LE"};

struct Decoded {
    std::string text;       // UTF-8
    long long badLine = 0;  // the first with bytes that the encoding does not have; 0 without one
};

// The line, from 1, of the first replacement character for invalid bytes; 0 if there is none.
long long lineOf(std::u32string_view text) {
    const std::size_t bad = text.find(QvUtf::replacement);
    return bad == text.npos
               ? 0
               : 1 + std::count(text.begin(), text.begin() + static_cast<std::ptrdiff_t>(bad), U'\n');
}

Decoded decode(std::string_view bytes, int encoding) {
    while (bytes.ends_with('\0') && (encoding == QvText::utf8 || encoding > QvText::utf32))
        bytes.remove_suffix(1);
    if (encoding == QvText::utf8 && QvUtf::isValid(bytes)) return {std::string(bytes)};
    const std::u32string text = QvText::toUtf32(bytes, encoding);
    return {QvText::toUtf8(text), lineOf(text)};
}

// In this machine's order, or the other one.
std::string decodeUnits(std::string_view bytes, bool wide, bool bigEndian) {
    const SubtitleMark mark{wide        ? bigEndian ? QvSubtitles::markUtf32be : QvSubtitles::markUtf32le
                            : bigEndian ? QvSubtitles::markUtf16be
                                        : QvSubtitles::markUtf16le,
                            0};
    return subtitleText(bytes, mark, bigEndian);
}

std::string nameOf(int encoding) {
    const Any name = QvText::encodingName(encoding);
    return name.asString("");
}

class Reader {
  public:
    Reader(std::string_view bytes, int encoding, Findings& findings)
        : bytes_(bytes), encoding_(encoding), findings_(findings) {}

    std::string text() {
        if (const SubtitleMark mark = findMark(bytes_); mark.encoding != QvSubtitles::markNone)
            return marked(mark);
        if (encoding_ == QvText::utf16 || encoding_ == QvText::utf32) return units();
        return encoding_ == QvText::bytes ? found() : asked();
    }

  private:
    std::string marked(const SubtitleMark& mark) {
        findings_.encoding = unicodeNames[mark.encoding - 1];
        const std::string_view rest = bytes_.substr(mark.size);
        if (mark.encoding == QvSubtitles::markUtf8) return checked(decode(rest, QvText::utf8));
        const bool wide = mark.encoding >= QvSubtitles::markUtf32be;
        const bool big =
            mark.encoding == QvSubtitles::markUtf16be || mark.encoding == QvSubtitles::markUtf32be;
        return decodeUnits(rest, wide, big);
    }

    std::string units() {
        const bool wide = encoding_ == QvText::utf32;
        const bool big = !wide && utf16Order(bytes_) == UnitOrder::big;
        findings_.encoding = wide ? "UTF-32LE" : big ? "UTF-16BE" : "UTF-16LE";
        return decodeUnits(bytes_, wide, big);
    }

    // In an encoding that the caller named.
    std::string asked() {
        Decoded decoded = decode(bytes_, encoding_);
        findings_.encoding = nameOf(encoding_);
        if (decoded.badLine == 0) return std::move(decoded.text);
        findings_.problem = Findings::otherEncoding;
        findings_.line = decoded.badLine;
        findings_.encoding = "";
        if (utf16Order(bytes_) != UnitOrder::none)
            findings_.encoding = "UTF-16";
        else if (const TextEncoding guess = guessEncoding(bytes_);
                 guess.encoding >= 0 && guess.encoding != encoding_)
            findings_.encoding = nameOf(guess.encoding);
        return std::move(decoded.text);
    }

    // In none that is known.
    std::string found() {
        if (const UnitOrder order = utf16Order(bytes_); order != UnitOrder::none) {
            findings_.encoding = order == UnitOrder::big ? "UTF-16BE" : "UTF-16LE";
            findings_.guessed = true;
            return decodeUnits(bytes_, false, order == UnitOrder::big);
        }
        if (!isText(bytes_)) {
            findings_.problem = Findings::noText;
            return "";
        }
        // An escape is of an encoding that changes its letters by it.
        if (Decoded plain = decode(bytes_, QvText::utf8);
            plain.badLine == 0 && bytes_.find('\x1B') == bytes_.npos) {
            findings_.encoding = "UTF-8";
            return std::move(plain.text);
        }
        return guessed();
    }

    std::string guessed() {
        const TextEncoding guess = guessEncoding(bytes_);
        findings_.guessed = true;
        if (guess.encoding >= 0) {
            Decoded decoded = decode(bytes_, guess.encoding);
            findings_.encoding = nameOf(guess.encoding);
            if (decoded.badLine == 0) return std::move(decoded.text);
        } else {
            findings_.encoding = guess.name;
        }
        findings_.problem = Findings::unknownEncoding;
        return "";
    }

    std::string checked(Decoded decoded) {
        if (decoded.badLine > 0) {
            findings_.problem = Findings::otherEncoding;
            findings_.line = decoded.badLine;
            findings_.encoding = "";
        }
        return std::move(decoded.text);
    }

    std::string_view bytes_;
    int encoding_;
    Findings& findings_;
};

}  // namespace

SubtitleCopy::SubtitleCopy(std::string_view bytes, int encoding, bool maybeSub, QvSubtitleFindings& findings)
    : isSub(maybeSub) {
    std::string text = Reader(bytes, encoding, findings).text();
    std::replace(text.begin(), text.end(), '\0', ' ');
    if (isSub) normal = normalSub(text);
    if (isSub && normal.entries > 0) return;
    isSub = false;
    normal = normalSrt(text);
}
