// Pictures as PNG in two steps, of which the first, most of the work, may run on any thread.
#pragma once

#include <cstdio>
#include <memory>

class QvFrame;

// Keeps its memory from picture to picture; one picture at a time.
class PngEncoder {
  public:
    PngEncoder();
    ~PngEncoder();
    PngEncoder(const PngEncoder&) = delete;
    PngEncoder& operator=(const PngEncoder&) = delete;

    // Makes ready for pictures of this size, so that none of the following needs memory, except for what
    // libpng takes to write. False if there is not enough of it, or no such picture.
    bool prepare(int width, int height);
    void take(const QvFrame& picture);  // a copy; BGR3 of the size that was prepared
    void compress();
    bool write(std::FILE* file);  // what was compressed. False, with errno, if that fails

    // What prepare takes, in bytes.
    static size_t memoryFor(int width, int height);

  private:
    struct Work;
    std::unique_ptr<Work> work_;
};
