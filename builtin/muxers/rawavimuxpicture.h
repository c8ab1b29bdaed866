// How the pictures of one video stream lie in an AVI file.
#pragma once

#include <cstddef>
#include <functional>
#include <optional>
#include <vector>

// A frame comes as an encoder puts it out, its planes one after the other with the default strides; the file
// has its own conventions:
//
//     BGR3, BGR4, BGRA        bottom-up, rows padded with zeros to 4 bytes
//     YUY2, YUYV, UYVY        top-down; of an odd width the last pair of pixels is completed
//     I420, YV12              top-down, rows without padding; chroma planes as in the frame, of YV12 V before
//                             U; the chroma of an odd width or height is rounded up, by repeating the last
//                             column or row
//     v210                    top-down, as they come
//
// Y216 is not among them: readers take files of that tag for samples of 14 bits.
class AviPicture {
  public:
    using Put = std::function<bool(const unsigned char* data, size_t bytes)>;

    AviPicture() = default;  // of nothing
    // None for a type that AVI does not hold, and for a width or height below 1.
    static std::optional<AviPicture> of(unsigned fourcc, int width, int height);

    int width() const { return width_; }
    int height() const { return height_; }
    unsigned compression() const { return compression_; }  // FOURCC of the file, 0 for RGB
    int bitsPerPixel() const { return bitsPerPixel_; }
    size_t frameBytes() const { return frameBytes_; }  // of a frame as it comes
    size_t fileBytes() const { return fileBytes_; }    // of the same in the file
    // Gives the bytes of the file in order, from the frame itself wherever they lie so there. False when
    // `put` says so.
    bool write(const unsigned char* frame, const Put& put);

  private:
    struct Plane {
        size_t from;  // offset in the frame
        size_t fromStride, toStride;
        size_t rowBytes;  // of a row that are taken over
        int fromRows, toRows;
        int repeat;  // what a row lacks repeats the bytes this far before; 0: zeros
        bool flip;

        bool asItIs() const {
            return !flip && fromStride == toStride && rowBytes == toStride && fromRows == toRows;
        }
    };

    bool writeRows(const Plane& plane, const unsigned char* from, const Put& put);

    std::vector<Plane> planes_;  // in the file's order
    std::vector<unsigned char> band_;
    unsigned compression_ = 0;
    int bitsPerPixel_ = 0;
    int width_ = 0;
    int height_ = 0;
    size_t frameBytes_ = 0;
    size_t fileBytes_ = 0;
};
