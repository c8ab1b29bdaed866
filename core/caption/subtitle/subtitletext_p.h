// The text of a subtitle file, freed of its byte order mark.
#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>

class Any;
class QvByteSource;

// A file's bytes, followed by four zeros.
class SubtitleBytes {
  public:
    // 0, or -1; want of memory is logged.
    int read(const Any& filename);
    // From where the source is to its end, which it has to reach.
    int read(QvByteSource& source);
    std::string_view view() const { return {memory_.get(), size_}; }

  private:
    struct Release {
        void operator()(char* memory) const;
    };
    int allocate(long long bytes);

    std::unique_ptr<char, Release> memory_;
    std::size_t size_ = 0;
};

struct SubtitleMark {
    int encoding = 0;      // QvSubtitles::Encoding
    std::size_t size = 0;  // bytes
};
SubtitleMark findMark(std::string_view bytes);

// The text after the mark as UTF-8 (or unchanged, in an encoding that the file does not name), with line
// feeds where the file uses carriage returns alone. A unit of several bytes is taken in this machine's order,
// or with its bytes `swapped`.
std::string subtitleText(std::string_view bytes, const SubtitleMark& mark, bool swapped);

// How much of such a text is read at most.
std::size_t subtitleBound(std::string_view bytes, const SubtitleMark& mark);

// Zeros inside are no text in an encoding of single bytes; padding at the end is.
bool isText(std::string_view text);
