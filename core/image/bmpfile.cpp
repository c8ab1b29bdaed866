#include "core/image/bmpfile_p.h"

#include <vector>

#include "core/media/qvframe.h"

namespace {

constexpr unsigned headerBytes = 14 + 40;
constexpr unsigned pixelsPerMetre = 2835;  // 72 an inch

class Header {
  public:
    void word(unsigned value) {
        bytes_.push_back(static_cast<unsigned char>(value));
        bytes_.push_back(static_cast<unsigned char>(value >> 8));
    }
    void dword(unsigned value) {
        word(value);
        word(value >> 16);
    }
    const std::vector<unsigned char>& bytes() const { return bytes_; }

  private:
    std::vector<unsigned char> bytes_;
};

Header headerOf(const QvFrame& frame) {
    const auto imageBytes = static_cast<unsigned>(frame.bytes(0));
    Header header;
    header.word('B' | 'M' << 8);
    header.dword(imageBytes + headerBytes);
    header.word(0);
    header.word(0);
    header.dword(headerBytes);

    header.dword(40);
    header.dword(static_cast<unsigned>(frame.width()));
    header.dword(static_cast<unsigned>(frame.height()));
    header.word(1);   // plane
    header.word(24);  // bits a pixel
    header.dword(0);  // no compression
    header.dword(imageBytes);
    header.dword(pixelsPerMetre);
    header.dword(pixelsPerMetre);
    header.dword(0);  // colours
    header.dword(0);  // important colours
    return header;
}

bool write(std::FILE* file, const unsigned char* bytes, std::size_t count) {
    return count == 0 || std::fwrite(bytes, 1, count, file) == count;
}

}  // namespace

bool qvWriteBmp(const QvFrame& frame, std::FILE* file) {
    const Header header = headerOf(frame);
    if (!write(file, header.bytes().data(), header.bytes().size())) return false;
    const auto pixels = static_cast<std::size_t>(frame.width()) * 3;
    const std::vector<unsigned char> padding(static_cast<std::size_t>(frame.stride()) - pixels);
    const unsigned char* row = frame.plane(0, true);
    for (int y = 0; y < frame.height(); ++y, row += frame.stride(0, true))
        if (!write(file, row, pixels) || !write(file, padding.data(), padding.size())) return false;
    return true;
}
