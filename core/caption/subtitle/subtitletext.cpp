#include "core/caption/subtitle/subtitletext_p.h"

#include <algorithm>
#include <limits>

#include "core/arch/platform.h"
#include "core/caption/subtitle/qvsubtitles.h"
#include "core/caption/text/qvtext.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/stream/qvbytesource.h"

namespace {

using namespace std::string_view_literals;

constexpr std::size_t spareBytes = 4;

// Old files end their lines with a carriage return alone; the first line shows it.
bool endsLinesWithCr(std::string_view text) {
    const std::size_t first = text.find_first_of("\r\n");
    if (first == text.npos) return false;
    const std::size_t next = text.find_first_not_of('\r', first);
    return text[first] == '\r' && (next == text.npos || text[next] != '\n');
}

std::string swappedUnits(std::string_view bytes, std::size_t unit) {
    std::string out(bytes.substr(0, bytes.size() / unit * unit));
    for (std::size_t at = 0; at < out.size(); at += unit)
        std::reverse(out.begin() + static_cast<std::ptrdiff_t>(at),
                     out.begin() + static_cast<std::ptrdiff_t>(at + unit));
    return out;
}

std::string converted(std::string_view bytes, int encoding, bool swapped) {
    const bool wide = encoding >= QvSubtitles::markUtf32be;
    const std::string units = swapped ? swappedUnits(bytes, wide ? 4 : 2) : std::string(bytes);
    return QvText::toUtf8(QvText::toUtf32(units, wide ? QvText::utf32 : QvText::utf16));
}

bool hasUnits(const SubtitleMark& mark) { return mark.encoding >= QvSubtitles::markUtf16be; }

}  // namespace

void SubtitleBytes::Release::operator()(char* memory) const { qv_platform().release(memory); }

int SubtitleBytes::read(const Any& filename) {
    const auto file = qvFileSource(filename);
    return file && file->size() != QvByteSource::unknown ? read(*file) : QvStatus::failed;
}

int SubtitleBytes::allocate(long long bytes) {
    const bool fits = bytes <= std::numeric_limits<int>::max() - static_cast<int>(spareBytes);
    const auto room = static_cast<std::size_t>(bytes) + spareBytes;
    memory_.reset(fits ? static_cast<char*>(qv_platform().allocate(room, 16)) : nullptr);
    if (memory_) return QvStatus::ok;
    qv_dbg()->error("parseFile() internal error");
    return QvStatus::failed;
}

int SubtitleBytes::read(QvByteSource& source) {
    const long long said = source.size();
    std::string gathered;  // what comes of a source of unknown size
    if (said == QvByteSource::unknown) {
        constexpr std::size_t piece = 64 * 1024;
        for (std::size_t got = piece; got == piece;) {
            const std::size_t had = gathered.size();
            gathered.resize(had + piece);
            got = source.read(gathered.data() + had, piece);
            gathered.resize(had + got);
            if (gathered.size() > static_cast<std::size_t>(QvByteSource::mostUnknown))
                return QvStatus::failed;
        }
    }
    const long long length =
        said == QvByteSource::unknown ? static_cast<long long>(gathered.size()) : said - source.position();
    if (length < 0 || allocate(length) != QvStatus::ok) return QvStatus::failed;
    const auto wanted = static_cast<std::size_t>(length);
    size_ = said == QvByteSource::unknown ? gathered.copy(memory_.get(), wanted)
                                          : source.read(memory_.get(), wanted);
    // A file that got shorter meanwhile is being written.
    if (size_ != wanted || source.failed()) return QvStatus::failed;
    std::fill_n(memory_.get() + size_, spareBytes, '\0');
    return QvStatus::ok;
}

SubtitleMark findMark(std::string_view bytes) {
    if (bytes.starts_with("\xEF\xBB\xBF")) return {QvSubtitles::markUtf8, 3};
    if (bytes.starts_with("\xFE\xFF")) return {QvSubtitles::markUtf16be, 2};
    if (bytes.starts_with("\xFF\xFE\0\0"sv)) return {QvSubtitles::markUtf32le, 4};
    if (bytes.starts_with("\xFF\xFE")) return {QvSubtitles::markUtf16le, 2};
    if (bytes.starts_with("\0\0\xFE\xFF"sv)) return {QvSubtitles::markUtf32be, 4};
    return {QvSubtitles::markNone, 0};
}

std::string subtitleText(std::string_view bytes, const SubtitleMark& mark, bool swapped) {
    bytes.remove_prefix(mark.size);
    std::string text = hasUnits(mark) ? converted(bytes, mark.encoding, swapped) : std::string(bytes);
    if (endsLinesWithCr(text)) std::replace(text.begin(), text.end(), '\r', '\n');
    return text;
}

std::size_t subtitleBound(std::string_view bytes, const SubtitleMark& mark) {
    // The bytes of the file stay the measure of a text that was converted, less the mark once more.
    const std::size_t marks = hasUnits(mark) ? 2 * mark.size : mark.size;
    return bytes.size() > marks ? bytes.size() - marks : 0;
}

bool isText(std::string_view text) {
    return text.find_first_not_of('\0', std::min(text.find('\0'), text.size())) == text.npos;
}
