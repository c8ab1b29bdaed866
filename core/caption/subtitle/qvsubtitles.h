// Text subtitles: SubRip ("srt") and frame-numbered MicroDVD ("sub") files, read, written and searched.
#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "core/arch/api.h"
#include "core/measure/qvgeometry.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QvByteSource;
class SubtitleBytes;
struct ParsedSubtitle;

// One entry: lines of text that are shown for a time.
class QV_API QvSubtitle {
  public:
    Any text = "";  // lines separated by "|": a String of UTF-8, or of the bytes of a file without stated
                    // encoding; UTF-16 and UTF-32 for the renderer as Generic bytes
    int rows = 1;   // number of lines
    QvPoint position{-1, -1};  // on the picture, from its top left corner; -1, -1: the default place
    MediaTime start;           // at the default timescale
    MediaTime end;             // the last instant at which it is shown
    AnyVector fieldMasks;  // Int32 for each character: bit 0 leaves out even picture lines, bit 1 odd ones
};

// What QvSubtitles::readFile reports about a file.
struct QvSubtitleFindings {
    enum Problem {
        none,
        unreadable,       // or of another extension
        noText,           // binary
        otherEncoding,    // not in the encoding that was asked for; read with U+FFFD for what is invalid
        unknownEncoding,  // not stated, and not recognised
        noSubtitles,
    };
    Problem problem = none;
    std::string encoding;  // "UTF-8", "UTF-16LE", or a code page's name; with otherEncoding what it may be,
                           // with unknownEncoding what it seems to be, each "" if nothing is known
    bool guessed = false;  // `encoding` is not from the file nor from the caller
    long long line = 0;    // with otherEncoding: the first line that is invalid
    int lost = 0;          // entries whose times or frame numbers can't be read
    bool hasRate = false;  // rate() is the rate that a MicroDVD file states
};

// The subtitles of a file in its order. Pointers to entries are valid until the next parseFile.
class QV_API QvSubtitles {
  public:
    enum Format : int { SRT = 1, SUB = 2 };
    // The byte order mark that a file began with.
    enum Encoding : int {
        markNone = 0,
        markUtf8 = 1,
        markUtf16be = 2,
        markUtf16le = 3,
        markUtf32be = 4,
        markUtf32le = 5,
    };

    // Replaces the entries by those of a file, whose extension says the format. `rate` gives the frame
    // numbers of a SUB file their times. A file named "sub" that holds no "{n}{n}" line is read as SRT, which
    // also knows the SubViewer form of the times line, "00:00:01.000,00:00:02.000" ("[br]" breaks its
    // lines). Malformed numbers read as 0.
    // 0, also for a file without any entry. -1: it can't be read, is no text, or has another extension, or a
    // SUB line is malformed; the entries before that line are kept.
    int parseFile(const Any& filename, const QvFramerate& rate);
    // The same from the current position of a byte source to its end; a read that fails before is a failure.
    // `name` has the extension. The source need not allow seeking. If its size is unknown, more than
    // QvByteSource::mostUnknown is not read.
    int parseSource(QvByteSource& source, const Any& name, const QvFramerate& rate);
    // For files of any origin: parseFile on a copy in memory, which is converted to UTF-8 and to the line
    // ends, times, tags and order that parseFile expects. `encoding`: of QvText, for a file without a byte
    // order mark; 0: ASCII or UTF-8, and if it is neither, the most probable one. Any other file than "srt"
    // and "sub" is opened as a film, and its subpicture stream `stream`, from 0 on, is read if that is text.
    // 0, or -1 if there are no subtitles in the file.
    int readFile(const Any& filename, const QvFramerate& rate, int encoding, QvSubtitleFindings& findings,
                 int stream = 0);
    // After all others, which start no later. `text`: UTF-8, lines separated by "|".
    void append(const std::string& text, const MediaTime& start, const MediaTime& end);
    // Writes all entries; a SUB file gets frame numbers at rate(). The lines are also printed on the standard
    // output. -1 if the file can't be written completely.
    int saveToFile(const Any& filename, Format format) const;

    // The entry that is shown at `time` (at the default timescale), or null. Rising times are found fastest.
    // Borrowed. Of entries that overlap any one may be found.
    QvSubtitle* find(const MediaTime& time);
    // Keeps each entry on its frame numbers, not on its times.
    void changeFramerate(const QvFramerate& rate);

    int nrSubtitles() const { return static_cast<int>(entries_.size()); }
    QvSubtitle* at(int index);  // an assertion outside the range; borrowed
    const QvSubtitle* at(int index) const;
    Format format() const { return format_; }
    const QvFramerate& rate() const { return rate_; }
    Encoding encoding() const { return encoding_; }
    // For people: "SubRip", "SubViewer" or "MicroDVD"; and "UTF-16LE" and so on for a file with a mark, else
    // "ASCII", "UTF-8" where the bytes are that, or "8-bit" for those of a code page that the file does not
    // name.
    const char* formatName() const;
    const char* encodingName() const;
    int maxRows() const { return maxRows_; }  // of all entries; 0 without any

    // Bytes of text, as UTF-8, after the place where parseFile stopped: in an SRT file at a number that no
    // times follow, in UTF-16 and UTF-32 where the text becomes longer than the file. 0: all was read.
    long long unread() const { return unread_; }

  private:
    std::vector<std::unique_ptr<QvSubtitle>> entries_;
    Format format_ = SRT;
    Encoding encoding_ = markNone;
    const char* unmarked_ = "";  // encodingName of a file without a mark
    bool subViewer_ = false;
    int maxRows_ = 0;
    int lastFound_ = 0;
    long long unread_ = 0;
    QvFramerate rate_;

    void clear(const QvFramerate& rate);
    int begin(const Any& filename, const QvFramerate& rate);
    int readFilm(const Any& filename, int stream, QvSubtitleFindings& findings);
    int parseBytes(const SubtitleBytes& bytes);
    void take(ParsedSubtitle&& parsed);
    int parse(std::string_view text, std::size_t bound);
    bool hit(int index, const MediaTime& time);
    int search(const MediaTime& time);
};
