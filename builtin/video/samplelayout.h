// How samples lie in the rows of each pixel format, for effects that work on samples of any format, and the
// weighted sums by which pictures are faded and covered.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <vector>

#include "core/media/qvframe.h"

enum class SampleRole : uint8_t {
    colour,  // of RGB: black is 0, white all ones
    video,   // of RGB from 16 to 235, in steps of 8 bits
    luma,    // 16 to 235
    chroma,  // 16 to 240, no colour is 128
    keep     // alpha, or unused: no effect changes it
};

struct SampleLayout {
    // Formats that pack several samples into a word are taken apart into words.
    enum Store : uint8_t { bytes, words, v210, r565, r555 };

    unsigned fourcc;
    Store store;
    uint8_t bits;                      // of a sample; the green of R565 has one more
    uint8_t perPixel;                  // samples of plane 0 for each pixel
    std::array<SampleRole, 4> first4;  // of a row of plane 0, over and over. Other planes are chroma

    SampleRole role(int plane, size_t sample) const {
        return plane ? SampleRole::chroma : first4[sample & 3];
    }
    uint32_t black(SampleRole role) const;
    uint32_t white(SampleRole role) const;
    uint32_t largest(size_t sample) const;  // value that a sample of a row can hold
    // Whether rows are weighed as words; otherwise as bytes.
    bool wide() const { return store != bytes; }
    // Samples in the first `pixels` pixels of plane 0, or in as many of another plane.
    size_t samples(int plane, int pixels) const {
        return static_cast<size_t>(pixels) * (plane ? 1u : perPixel);
    }
    // In a whole row of a frame; of v210 in whole groups of six pixels.
    size_t rowSamples(const QvFrame& frame, int plane) const;
    // Bytes from the start of a row to a pixel that begins at a byte; of v210 to a group of six.
    std::ptrdiff_t byteOffset(int plane, int pixel) const;
    // A row as words, and back; whole pixels, of v210 whole groups of six.
    void read(const unsigned char* from, uint16_t* words, size_t samples) const;
    void write(const uint16_t* words, unsigned char* to, size_t samples) const;
    // A bit for each of the first four samples of plane 0 that has this role.
    unsigned chosen(SampleRole role) const;
};

// Of any format that a frame can have.
const SampleLayout& sampleLayout(unsigned fourcc);

// All rows of a plane, of I422 also the lower half of the chroma.
int sampleRows(const QvFrame& frame, int plane);

// Gives `out` the format and size of `like`, with undefined contents. 0, or -3 with `out` empty.
int takeShape(QvFrame& out, const QvFrame& like);

// All samples of a frame of the same format and size; QvFrame's own copy leaves half of the chroma of I422.
// From plane `first` on; nothing if both are one frame.
void copySamples(QvFrame& to, const QvFrame& from, int first = 0);

// What becomes of each sample of a row: sample * scale + add. Made for one layout.
class SampleWeights {
  public:
    void resize(const SampleLayout& layout, size_t samples);
    // Sample i becomes `share` / 65536 of itself and the rest of `level`.
    void fade(size_t i, uint32_t level, uint32_t share);
    // Sample i becomes laid + (sample - black) * (1 - weight / 65536), where `laid` is the covering picture
    // as it looks over black.
    void cover(size_t i, uint32_t laid, uint32_t black, uint32_t weight);
    // Applies weights `first` and following to a row; `to` may be `from`.
    void apply(unsigned char* to, const unsigned char* from, size_t first, size_t samples);

  private:
    const SampleLayout* layout_ = nullptr;
    std::vector<uint16_t> scale8_, add8_;
    std::vector<uint32_t> scale16_, add16_;
    std::vector<uint16_t> apart_;  // a row of packed samples
};
