// libpng leaves a failing call by longjmp. The functions named ...Jumping are the only ones that it may
// leave: they own nothing and call nothing that does.
#include "core/image/pngfile_p.h"

#include <csetjmp>
#include <cstdint>
#include <new>
#include <vector>

#include <png.h>

#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/image/pngencoder_p.h"
#include "core/media/qvframe.h"

namespace {

constexpr int signatureBytes = 8;
// Deflate makes one byte out of at least 1/1032: what an image of a given size must take in its file.
constexpr unsigned long long maxInflation = 1032;
constexpr int fillerValue = 255;

struct Message {
    char text[256] = "";
};

[[noreturn]] void onError(png_structp png, png_const_charp text) {
    if (auto* message = static_cast<Message*>(png_get_error_ptr(png)))
        std::snprintf(message->text, sizeof(message->text), "%s", text ? text : "");
    png_longjmp(png, 1);
}

void onWarning(png_structp, png_const_charp) {}

// By the language's own operators, so that the program notices that it runs out of memory.
png_voidp allocate(png_structp, png_alloc_size_t bytes) { return ::operator new(bytes, std::nothrow); }
void release(png_structp, png_voidp block) { ::operator delete(block); }

class Reader {
  public:
    Message message;
    png_structp png = png_create_read_struct_2(PNG_LIBPNG_VER_STRING, &message, onError, onWarning, nullptr,
                                               allocate, release);
    png_infop info = png ? png_create_info_struct(png) : nullptr;

    Reader() = default;
    Reader(const Reader&) = delete;
    Reader& operator=(const Reader&) = delete;
    ~Reader() { png_destroy_read_struct(&png, &info, nullptr); }
};

struct ImageHead {
    int width = 0;
    int height = 0;
    bool alpha = false;
};

// After this libpng delivers four bytes a pixel, B G R and alpha, whatever the file holds.
// An image that its file can't hold, by its length, is an error: it would only take memory.
bool readHeadJumping(png_structp png, png_infop info, std::FILE* file, unsigned long long fileBytes,
                     ImageHead* head) {
    if (setjmp(png_jmpbuf(png))) return false;
    png_init_io(png, file);
    png_set_sig_bytes(png, signatureBytes);
    png_read_info(png, info);
    if (1ULL * png_get_rowbytes(png, info) * png_get_image_height(png, info) / maxInflation > fileBytes)
        png_error(png, "file too short for its image");
    png_set_strip_16(png);
    png_set_expand(png);
    png_set_gray_to_rgb(png);
    png_set_bgr(png);
    head->alpha = (png_get_color_type(png, info) & PNG_COLOR_MASK_ALPHA) != 0 ||
                  png_get_valid(png, info, PNG_INFO_tRNS) != 0;
    if (!head->alpha) png_set_filler(png, fillerValue, PNG_FILLER_AFTER);
    png_set_interlace_handling(png);
    png_read_update_info(png, info);
    if (png_get_rowbytes(png, info) != 4 * static_cast<std::size_t>(png_get_image_width(png, info)))
        png_error(png, "unexpected row size");
    head->width = static_cast<int>(png_get_image_width(png, info));
    head->height = static_cast<int>(png_get_image_height(png, info));
    return true;
}

bool readRowsJumping(png_structp png, png_infop info, png_bytepp rows) {
    if (setjmp(png_jmpbuf(png))) return false;
    png_read_image(png, rows);
    png_read_end(png, info);
    return true;
}

int even(int value) { return (value + 1) & ~1; }

bool prepare(const ImageHead& head, QvFrame& picture, QvFrame* alpha) {
    const int width = even(head.width);
    const int height = even(head.height);
    const bool fits =
        picture.four_cc() == QvFourcc::BGR4 && picture.width() == width && picture.height() == height;
    if (!fits) {
        if (picture.init(QvFourcc::BGR4, width, height) != QvStatus::ok) return false;
        picture.setBlack();
    }
    if (!alpha) return true;
    if (alpha->init(QvFourcc::GRAY, width, height) != QvStatus::ok) return false;
    alpha->setBlack();
    return true;
}

std::vector<png_bytep> rowPointers(QvFrame& frame, int rows) {
    std::vector<png_bytep> pointers;
    pointers.reserve(static_cast<std::size_t>(rows));
    for (int y = 0; y < rows; ++y)
        pointers.push_back(frame.plane() + static_cast<std::ptrdiff_t>(y) * frame.stride());
    return pointers;
}

// The alpha goes to its own frame, and the fourth byte of each pixel becomes 0.
void splitAlpha(const ImageHead& head, QvFrame& picture, QvFrame* alpha) {
    for (int y = 0; y < head.height; ++y) {
        unsigned char* pixel = picture.pixelPtr(0, y);
        unsigned char* to = alpha ? alpha->pixelPtr(0, y) : nullptr;
        for (int x = 0; x < head.width; ++x, pixel += 4) {
            if (to) to[x] = pixel[3];
            pixel[3] = 0;
        }
    }
}

// Length of a file; of a pipe, which has none, the largest there is.
unsigned long long bytesOf(std::FILE* file) {
    const long at = std::ftell(file);
    if (at < 0 || std::fseek(file, 0, SEEK_END) != 0) return ~0ULL;
    const long end = std::ftell(file);
    std::fseek(file, at, SEEK_SET);
    return end < 0 ? ~0ULL : static_cast<unsigned long long>(end);
}

}  // namespace

bool qvIsPng(std::FILE* file) {
    png_byte signature[signatureBytes] = {};
    return std::fread(signature, 1, signatureBytes, file) == signatureBytes &&
           png_sig_cmp(signature, 0, signatureBytes) == 0;
}

int qvReadPng(std::FILE* file, const char* name, QvFrame& picture, QvFrame* alpha) {
    Reader reader;
    ImageHead head;
    if (!reader.info || !readHeadJumping(reader.png, reader.info, file, bytesOf(file), &head)) {
        qv_log()->warning("Can not read %s: %s", name, reader.message.text);
        return QvStatus::cannotParse;
    }
    QvFrame* alphaFrame = head.alpha ? alpha : nullptr;
    if (!prepare(head, picture, alphaFrame)) {
        qv_log()->error("Can not read %s: out of memory", name);
        return QvStatus::failed;
    }
    auto rows = rowPointers(picture, head.height);
    const bool whole = readRowsJumping(reader.png, reader.info, rows.data());
    if (!whole) qv_log()->warning("%s is damaged: %s", name, reader.message.text);
    splitAlpha(head, picture, alphaFrame);
    return whole ? QvStatus::ok : QvStatus::cannotParse;
}

bool qvWritePng(const QvFrame& frame, std::FILE* file) {
    PngEncoder encoder;
    if (!encoder.prepare(frame.width(), frame.height())) return false;
    encoder.take(frame);
    encoder.compress();
    return encoder.write(file);
}
