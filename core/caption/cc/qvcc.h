// Closed captions as the byte pairs of a CEA-708 cc_data structure (ATSC A/53), and the queue that deals them
// out to frames.
//
// A frame carries its captions in its subpicture slot, as what QvCcData::store writes:
//
//     QvCcData captions;
//     if (frame.subpic() && captions.restore(*frame.subpic()) == 0) use(captions);
//
// Objects belong to one thread at a time.
#pragma once

#include <span>
#include <string>
#include <vector>

#include "core/arch/api.h"
#include "core/measure/mediatime.h"
#include "core/measure/qvframerate.h"
#include "core/value/ptrlist.h"

class Any;
class AnyDict;
class AnyVector;
class QvByteSource;

struct QV_API QvCcBytePair {
    enum Type { field1 = 0, field2 = 1, dtvccData = 2, dtvccStart = 3 };  // the first two are CEA-608

    MediaTime time;               // at the default timescale
    unsigned char header = 0xF8;  // 0xF8: marker; bit 2: cc_valid; bits 1 and 0: cc_type
    unsigned char byte1 = 0;      // cc_data_1, with its parity bit
    unsigned char byte2 = 0;

    QvCcBytePair() = default;
    // The lowest two bits of `type` and the lowest eight of the bytes count.
    QvCcBytePair(int type, int b1, int b2, bool valid);
    // A time at another timescale is converted, truncated to a tick.
    QvCcBytePair(const MediaTime& time, int type, int b1, int b2, bool valid);

    int type() const { return header & 3; }
    void setType(int type) { header = static_cast<unsigned char>((header & ~3) | (type & 3)); }
    bool valid() const { return (header & 4) != 0; }
    void setValid(bool valid) { header = static_cast<unsigned char>(valid ? header | 4 : header & ~4); }
    bool is608() const { return type() <= field2; }
    // Makes a 608 pair that is not valid the valid 0x80, 0x80; leaves others alone.
    void invalidToNull();
    // Not valid, or a CEA-608 null.
    bool isFiller() const;

    // "d", header and bytes as one Int32, and "t", the MediaTime.
    void store(AnyDict& dict) const;
    int restore(const AnyDict& dict);  // 0, or -1 with the pair unchanged

    bool operator==(const QvCcBytePair&) const = default;
};

// Options of the writer of SCC files beyond the plain format.
struct QV_API QvSccWriting {
    // A drop-frame rate is written as "HH:MM:SS;FF", which readScc takes with `dropFrameLines`.
    bool dropFrameLines = false;
    // Each word has four digits, and a line of more than 1000 pairs becomes several of the same time, so that
    // any list reads back whole. Without it a byte below 0x10 has one digit, so that readers reject its word.
    bool complete = false;
};

// A list of byte pairs. The order is that of the stream; times need not rise.
class QV_API QvCcData {
  public:
    static constexpr int maxBufferPairs = 31;  // the largest count that a cc_data structure can state
    enum BufferFormat { generic = 0, a53 = 3, a72 = 5 };

    bool processCCDataFlag() const { return process_; }  // process_cc_data_flag, on at first
    void setProcessCCDataFlag(bool process) { process_ = process; }

    // --- The list.
    int count() const { return static_cast<int>(pairs_.size()); }
    std::span<const QvCcBytePair> pairs() const { return pairs_; }
    // An assertion outside the list. Valid until the list changes.
    QvCcBytePair& at(int index);
    const QvCcBytePair& at(int index) const;
    void clear() { pairs_.clear(); }  // the flag stays
    void append(const QvCcBytePair& pair) { pairs_.push_back(pair); }
    void remove(int index);  // ignored outside the list
    // Positions before the call; those outside the list are ignored. `sorted`: they rise.
    void remove(const AnyVector& indexes, bool sorted);
    // Appends pointers to the pairs at these positions to `to`, which owns nothing. They are valid until the
    // list changes.
    void select(const AnyVector& indexes, TPtrList<QvCcBytePair>& to);
    // Copies of the other's pairs, with their times; null for all. `other` may be this list.
    void extend(const QvCcData& other, const AnyVector* indexes = nullptr);
    // Pairs of a type that carry nothing: 0x80, 0x80 for valid ones of CEA-608, else zeros.
    void appendFillers(int count, int type, bool valid, const MediaTime& t);
    // Drops the fillers with a time up to t; the others keep their order. Returns how many went.
    int removeFillers(const MediaTime& t);

    // --- Times.
    // Of pairs `first` to `last`, inclusive. A `last` of -1 or past the end is the end, a `first` outside the
    // list the start.
    void setTime(const MediaTime& t, int first = 0, int last = -1);
    // 0 for an empty list. `sorted`: the caller knows that times rise, which saves the search.
    MediaTime minTime(bool sorted = false) const;
    MediaTime maxTime(bool sorted = false) const;
    void shiftTimes(const MediaTime& delta);
    bool isSorted() const;
    void sort();  // by time; pairs of one time keep their order

    // Positions of the pairs that pass every test; a null argument is no test.
    //
    //   typeMask    bit n takes type n
    //   start, end  first and last position looked at. A start past the list is its last pair, an end below 0
    //               or past the list its end
    //   tMin, tMax  inclusive, compared by ticks. A pair past tMax ends the search with `stopAtMax`
    //   maxCount    no more than this; none below 1
    AnyVector find(const int* typeMask, const int* start, const int* end, const MediaTime* tMin,
                   const MediaTime* tMax, const bool* valid, bool stopAtMax, const int* maxCount) const;

    // --- Forms.
    // "name" = "cc_data", "process" = 0 or 1, "data" = a Vector of what the pairs store.
    void store(AnyDict& dict) const;
    // 0. -1, with this list unchanged, for a dictionary that is no caption data.
    int restore(const AnyDict& dict);

    // cc_data as in a bitstream, `fmt` as BufferFormat.
    static int detectBufferFmt(int size, const unsigned char* data);  // a53, a72, or -1
    int byteSize(int fmt) const;                                      // -12 for an unknown format
    // Writes byteSize(fmt) bytes and returns their number. -12: unknown format; -18: more than 31 pairs, or
    // `size` is less. Nothing is written then.
    int toBuffer(int fmt, int size, unsigned char* data) const;
    // Replaces list and flag; the pairs take the time, or 0. 0. -12: unknown format; -18: the bytes are not
    // of this format or end early, and the list is empty.
    int fromBuffer(int fmt, int size, const unsigned char* data, const MediaTime* t);

    // For the log: times as timecodes of the rate, or in seconds without one.
    std::string dbgDump(const QvFramerate* rate) const;

    // --- SCC files (Scenarist), one field each.
    // Replaces the list by the pairs of a file, as `type` (0 or 1), each line's at the time of its timecode.
    // 0; -15, with the list unchanged, for a file that can't be opened or is no SCC file.
    //
    //   detect          true: `rate` becomes what the highest frame number suggests. False: it is taken as it
    //                   is, with a warning if it seems wrong
    //   dropFrame       null, or what takes the place of the rate's df
    //   dropFrameLines  accepts what files in use have: ";" before the frames, which makes the rate that is
    //                   found drop frame; carriage returns as line ends; a UTF-8 mark at the start; damaged
    //                   words, which are named in warnings with their lines
    int readScc(const Any& filename, int type, bool detect, QvFramerate& rate, const bool* dropFrame,
                bool dropFrameLines = false);
    // The same from the current position of a source to its end; a read that fails before is a failure.
    // `name` is for messages. The source need not allow seeking. If its size is unknown, more than
    // QvByteSource::mostUnknown is not read.
    int readScc(QvByteSource& source, const Any& name, int type, bool detect, QvFramerate& rate,
                const bool* dropFrame, bool dropFrameLines = false);
    // Writes all pairs, whatever their type, a run of equal times as one line. 0; -1 for a file that can't be
    // written. An assertion, with no file touched, for a line of more than 1000 pairs.
    int writeScc(const Any& filename, const QvFramerate& rate, const QvSccWriting& options = {}) const;
    std::string sccText(const QvFramerate& rate,
                        const QvSccWriting& options = {}) const;  // the same, as text

    bool operator==(const QvCcData&) const = default;

  protected:
    int _fromBufferGeneric(int size, const unsigned char* data, const MediaTime* t);
    void removeRising(std::span<const int> indexes);  // distinct positions of the list, rising

    std::vector<QvCcBytePair> pairs_;

  private:
    bool process_ = true;
};

// A queue of pairs that gives each frame as many as its rate requires, fillers included:
//
//     QvCcProcessor queue;
//     queue.start(true, false, QvFramerate::f29p(), QvCcProcessor::valid608_1);
//     queue.append(captionsOfFrame);
//     queue.get(cc, frameTime, 0);        // 20 pairs
//
// Per second and field that is 30 (or 29.97) pairs: 20 slots a frame at 30 frames, 10 at 60, 25 at 24.
class QV_API QvCcProcessor : public QvCcData {
  public:
    enum Flags { valid608_1 = 1, valid608_2 = 2 };  // fillers of that field are valid nulls

    // Empties the queue and starts the schedule.
    void start(bool do608, bool do708, const QvFramerate& rate, int flags);
    void append(const QvCcData& data) { extend(data); }
    using QvCcData::append;
    // Replaces the pairs of `out` by those of the next frame: queued ones with a time up to t, as many as
    // there are slots, then fillers. The rest stays queued. 0. An assertion for rates other than 23.976, 24,
    // 29.97, 30, 59.94 and 60 frames, and for `out` being the queue itself.
    int get(QvCcData& out, const MediaTime& t, int flags = 0);

    int frameCounter() const { return frameCounter_; }

  private:
    struct Schedule;
    struct Found;

    void _getNeededBytepairs(Schedule& schedule) const;
    void search(unsigned typeMask, int most, const MediaTime& t, Found& found) const;
    void _copyBytePairs(const Schedule& schedule, Found* found, QvCcData& out);

    bool do608_ = false;
    bool do708_ = false;
    QvFramerate rate_;
    int frameCounter_ = 0;
    bool valid608_1Fillers_ = false;
    bool valid608_2Fillers_ = false;
};
