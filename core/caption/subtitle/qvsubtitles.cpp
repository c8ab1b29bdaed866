#include "core/caption/subtitle/qvsubtitles.h"

#include <algorithm>
#include <cstdio>
#include <string>

#include "core/arch/qvassert.h"
#include "core/caption/subtitle/subtitlecopy_p.h"
#include "core/caption/subtitle/subtitleparser_p.h"
#include "core/caption/subtitle/subtitletext_p.h"
#include "core/decode/decodefactory.h"
#include "core/decode/qvdecoder.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/value/utf.h"

namespace {

constexpr auto timescale = MediaTime::defaultTimescale;

bool spans(const QvSubtitle& entry, const MediaTime& time) {
    return entry.start <= time && entry.end >= time;
}

Any extensionOf(const Any& filename) { return filename.isText() ? QvFile::getExt(filename, true) : Any(); }

// 0 for other files.
int formatOf(const Any& filename) {
    const Any ext = extensionOf(filename);
    return ext == "srt" ? QvSubtitles::SRT : ext == "sub" ? QvSubtitles::SUB : 0;
}

const char* encodingOfBytes(std::string_view text) {
    const bool ascii = std::all_of(text.begin(), text.end(), [](char c) { return (c & 0x80) == 0; });
    return ascii ? "ASCII" : QvUtf::isValid(text) ? "UTF-8" : "8-bit";
}

std::string textOf(const QvSubtitle& entry) {
    const Any narrow = entry.text.isWString() ? entry.text.toString() : entry.text;
    return narrow.asString("");
}

Any textValue(const std::string& text) { return text.empty() ? Any("") : Any(text.c_str()); }

// --- Writing.

std::string clock(const MediaTime& time) {
    const long long ms = std::max(time.ms(), 0LL);
    char text[48];
    std::snprintf(text, sizeof text, "%02lli:%02lli:%02lli,%03lli", ms / 3600000, ms / 60000 % 60,
                  ms / 1000 % 60, ms % 1000);
    return text;
}

void putSub(std::string& out, const QvSubtitle& entry, const QvFramerate& rate) {
    const auto frame = [&rate](const MediaTime& time) { return std::to_string(time.position(rate)); };
    out += "{" + frame(entry.start) + "}{" + frame(entry.end) + "}" + textOf(entry) + "\r\n";
}

void putSrt(std::string& out, const QvSubtitle& entry, int number) {
    out += std::to_string(number) + "\r\n" + clock(entry.start) + " --> " + clock(entry.end) + "\r\n";
    std::string lines = textOf(entry);
    for (std::size_t at = 0; (at = lines.find('|', at)) != lines.npos; at += 2) lines.replace(at, 1, "\r\n");
    out += lines + "\r\n\r\n";
}

bool writeFile(const Any& filename, const std::string& bytes) {
    auto* file = static_cast<std::FILE*>(qvfopen(filename, "wb"));
    if (!file) return false;
    const bool written = std::fwrite(bytes.data(), 1, bytes.size(), file) == bytes.size();
    return std::fclose(file) == 0 && written;
}

void echo(std::string text) {
    std::erase(text, '\r');
    std::fwrite(text.data(), 1, text.size(), stdout);
}

}  // namespace

// --- Reading.

void QvSubtitles::clear(const QvFramerate& rate) {
    rate_ = rate;
    maxRows_ = 0;
    entries_.clear();
    lastFound_ = 0;
    encoding_ = markNone;
    unmarked_ = "";
    subViewer_ = false;
    unread_ = 0;
}

int QvSubtitles::begin(const Any& filename, const QvFramerate& rate) {
    clear(rate);
    const int format = formatOf(filename);
    if (format == 0) {
        qv_dbg()->error("Error: Unsupported subtitle format %s", extensionOf(filename).asString(""));
        return QvStatus::failed;
    }
    format_ = static_cast<Format>(format);
    return QvStatus::ok;
}

int QvSubtitles::parseFile(const Any& filename, const QvFramerate& rate) {
    SubtitleBytes file;
    if (begin(filename, rate) != QvStatus::ok || file.read(filename) != QvStatus::ok) return QvStatus::failed;
    return parseBytes(file);
}

int QvSubtitles::parseSource(QvByteSource& source, const Any& name, const QvFramerate& rate) {
    SubtitleBytes bytes;
    if (begin(name, rate) != QvStatus::ok || bytes.read(source) != QvStatus::ok) return QvStatus::failed;
    return parseBytes(bytes);
}

int QvSubtitles::parseBytes(const SubtitleBytes& file) {
    const Format format = format_;
    const SubtitleMark mark = findMark(file.view());
    encoding_ = static_cast<Encoding>(mark.encoding);
    if (encoding_ == markNone) unmarked_ = encodingOfBytes(file.view());
    const std::size_t bound = subtitleBound(file.view(), mark);
    int status = parse(subtitleText(file.view(), mark, false), bound);
    // The mark of the other byte order is honoured where this machine's order says nothing.
    if (entries_.empty() && (encoding_ == markUtf16be || encoding_ == markUtf32be)) {
        format_ = format;
        status = parse(subtitleText(file.view(), mark, true), bound);
    }
    for (const auto& entry : entries_) maxRows_ = std::max(maxRows_, entry->rows);
    return status;
}

int QvSubtitles::readFilm(const Any& filename, int stream, QvSubtitleFindings& findings) {
    format_ = SRT;
    const std::unique_ptr<QvDecodePipe> film(QvDecFactory::decodePipe(filename));
    if (!film) {
        findings.problem = QvSubtitleFindings::unreadable;
        return QvStatus::failed;
    }
    unmarked_ = "UTF-8";
    findings.encoding = unmarked_;
    const bool there = stream >= 0 && stream < film->nrStreams(qvSubpicStream);
    const Any texts = there ? film->getSubpicParam(stream, "subtitles") : Any();
    if (texts.isVector()) {
        for (const Any& text : texts.asVector())
            append(text.asDict().getString("text", ""), text.asDict().get("start").asMediaTime(),
                   text.asDict().get("end").asMediaTime());
        findings.lost = film->getSubpicParam(stream, "lost").asInt32(0);
    }
    if (!entries_.empty()) return QvStatus::ok;
    findings.problem = QvSubtitleFindings::noSubtitles;
    return QvStatus::failed;
}

int QvSubtitles::readFile(const Any& filename, const QvFramerate& rate, int encoding,
                          QvSubtitleFindings& findings, int stream) {
    findings = QvSubtitleFindings();
    if (formatOf(filename) == 0) {
        clear(rate);
        return readFilm(filename, stream, findings);
    }
    SubtitleBytes file;
    if (begin(filename, rate) != QvStatus::ok || file.read(filename) != QvStatus::ok) {
        findings.problem = QvSubtitleFindings::unreadable;
        return QvStatus::failed;
    }
    encoding_ = static_cast<Encoding>(findMark(file.view()).encoding);
    unmarked_ = encoding_ == markNone ? "UTF-8" : "";
    const SubtitleCopy copy(file.view(), encoding, format_ == SUB, findings);
    format_ = copy.isSub ? SUB : SRT;
    const auto taker = [this](ParsedSubtitle&& parsed) { take(std::move(parsed)); };
    if (copy.normal.rate) rate_ = QvFramerate(*copy.normal.rate);
    if (copy.isSub)
        parseSub(copy.normal.text, rate_, taker);
    else
        parseSrt(copy.normal.text, taker);
    for (const auto& entry : entries_) maxRows_ = std::max(maxRows_, entry->rows);
    findings.hasRate = copy.normal.rate.has_value();
    findings.lost = copy.normal.lost + copy.normal.entries - nrSubtitles();
    if (entries_.empty() && findings.problem == QvSubtitleFindings::none)
        findings.problem = QvSubtitleFindings::noSubtitles;
    return entries_.empty() ? QvStatus::failed : QvStatus::ok;
}

void QvSubtitles::take(ParsedSubtitle&& parsed) {
    auto entry = std::make_unique<QvSubtitle>();
    entry->text = textValue(parsed.text);
    entry->rows = 1 + static_cast<int>(std::count(parsed.text.begin(), parsed.text.end(), '|'));
    entry->start = parsed.start;
    entry->end = parsed.end;
    subViewer_ |= parsed.subViewer;
    entries_.push_back(std::move(entry));
}

void QvSubtitles::append(const std::string& text, const MediaTime& start, const MediaTime& end) {
    take({start, end, text});
    maxRows_ = std::max(maxRows_, entries_.back()->rows);
}

int QvSubtitles::parse(std::string_view text, std::size_t bound) {
    unread_ = 0;
    if (!isText(text)) return QvStatus::failed;
    const auto taker = [this](ParsedSubtitle&& parsed) { take(std::move(parsed)); };
    const std::size_t beyond = text.size() - std::min(text.size(), bound);
    text.remove_suffix(beyond);
    unread_ = static_cast<long long>(beyond);
    if (format_ == SUB) {
        const int status = parseSub(text, rate_, taker);
        if (!entries_.empty()) return status;
        format_ = SRT;
    }
    unread_ += static_cast<long long>(parseSrt(text, taker));
    return QvStatus::ok;
}

const char* QvSubtitles::formatName() const {
    return format_ == SUB ? "MicroDVD" : subViewer_ ? "SubViewer" : "SubRip";
}

const char* QvSubtitles::encodingName() const {
    static constexpr const char* marked[] = {"", "UTF-8", "UTF-16BE", "UTF-16LE", "UTF-32BE", "UTF-32LE"};
    return encoding_ == markNone ? unmarked_ : marked[encoding_];
}

int QvSubtitles::saveToFile(const Any& filename, Format format) const {
    std::string out;
    int number = 0;
    for (const auto& entry : entries_) {
        ++number;
        if (format == SUB) putSub(out, *entry, rate_);
        if (format == SRT) putSrt(out, *entry, number);
    }
    if (!writeFile(filename, out)) return QvStatus::failed;
    echo(std::move(out));
    return QvStatus::ok;
}

// --- Finding.

QvSubtitle* QvSubtitles::at(int index) {
    QV_ASSERT(index >= 0 && index < nrSubtitles());
    return entries_[static_cast<std::size_t>(index)].get();
}

const QvSubtitle* QvSubtitles::at(int index) const { return const_cast<QvSubtitles*>(this)->at(index); }

bool QvSubtitles::hit(int index, const MediaTime& time) {
    if (index < 0 || index >= nrSubtitles() || !spans(*at(index), time)) return false;
    lastFound_ = index;
    return true;
}

QvSubtitle* QvSubtitles::find(const MediaTime& time) {
    if (hit(lastFound_, time) || hit(lastFound_ + 1, time)) return at(lastFound_);
    const int near = search(time);
    if (hit(near, time)) return at(near);
    for (int i = near - 10; i <= near + 9; ++i)
        if (hit(i, time)) return at(i);
    return nullptr;
}

// Halving steps through entries that are taken as sorted; ends on a hit or near to where one can be.
int QvSubtitles::search(const MediaTime& time) {
    const int count = nrSubtitles();
    int i = count / 2;
    bool forward = true;
    for (int step = count / 4 + 2; step != 0; step /= 2) {
        if (i >= 0 && i < count) {
            if (spans(*at(i), time)) return i;
            forward = at(i)->end < time;
        }
        i += forward ? step : -step;
    }
    return i;
}

void QvSubtitles::changeFramerate(const QvFramerate& rate) {
    if (!(QvFramerate(rate.rate()) == QvFramerate(rate_.rate()))) {
        for (const auto& entry : entries_)
            for (MediaTime* time : {&entry->start, &entry->end})
                *time = MediaTime(time->position(rate_), rate, timescale);
    }
    rate_ = rate;
}
