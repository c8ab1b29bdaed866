#include "core/image/pngencoder_p.h"

#include <algorithm>
#include <cerrno>
#include <csetjmp>
#include <cstring>
#include <new>

#include <libdeflate.h>
#include <png.h>

#include "core/image/pngfilter_p.h"
#include "core/media/qvframe.h"
#include "core/stream/platformblock_p.h"

namespace {

// Levels of deflate. Film packs to about the same size at all of them, but takes three times as long from the
// second on. What packs well, drawings and cards, is done soon at any, and gains.
constexpr int filmLevel = 1;
constexpr int drawingLevel = 6;
constexpr size_t drawingRatio = 8;
// One strip out of each group of rows is packed both ways to find out whether filters help. A strip has rows
// enough for matches between them.
constexpr size_t strip = 8;
constexpr size_t group = 192;
constexpr size_t chunkBytes = size_t{1} << 23;

struct FreeCompressor {
    void operator()(libdeflate_compressor* compressor) const { libdeflate_free_compressor(compressor); }
};
using Compressor = std::unique_ptr<libdeflate_compressor, FreeCompressor>;

size_t sampledRows(size_t height) {
    const size_t rest = height % group;
    return height / group * strip + std::min(rest, strip);
}

[[noreturn]] void onError(png_structp png, png_const_charp) { png_longjmp(png, 1); }
void onWarning(png_structp, png_const_charp) {}

// By the language's own operators, so that the program notices that it runs out of memory.
png_voidp allocate(png_structp, png_alloc_size_t bytes) { return ::operator new(bytes, std::nothrow); }
void release(png_structp, png_voidp block) { ::operator delete(block); }

class Writer {
  public:
    png_structp png = png_create_write_struct_2(PNG_LIBPNG_VER_STRING, nullptr, onError, onWarning, nullptr,
                                                allocate, release);
    png_infop info = png ? png_create_info_struct(png) : nullptr;

    Writer() = default;
    Writer(const Writer&) = delete;
    Writer& operator=(const Writer&) = delete;
    ~Writer() { png_destroy_write_struct(&png, &info); }
};

// libpng leaves a failing call by longjmp, which this function may be left by: it owns nothing.
bool writeJumping(png_structp png, png_infop info, std::FILE* file, png_uint_32 width, png_uint_32 height,
                  const unsigned char* packed, size_t bytes) {
    static constexpr png_byte data[] = "IDAT", end[] = "IEND";
    if (setjmp(png_jmpbuf(png))) return false;
    png_init_io(png, file);
    png_set_IHDR(png, info, width, height, 8, PNG_COLOR_TYPE_RGB, PNG_INTERLACE_NONE,
                 PNG_COMPRESSION_TYPE_DEFAULT, PNG_FILTER_TYPE_DEFAULT);
    png_write_info(png, info);
    for (size_t at = 0; at < bytes; at += chunkBytes)
        png_write_chunk(png, data, packed + at, std::min(chunkBytes, bytes - at));
    png_write_chunk(png, end, nullptr, 0);
    return true;
}

}  // namespace

struct PngEncoder::Work {
    Work(int w, int h)
        : width(w),
          height(h),
          bytes((static_cast<size_t>(w) * 3 + 1) * static_cast<size_t>(h)),
          room(libdeflate_zlib_compress_bound(nullptr, bytes)),
          rows(bytes),
          sample((static_cast<size_t>(w) * 3 + 1) * sampledRows(static_cast<size_t>(h))),
          filters(qvFilterRoom(static_cast<size_t>(w) * 3)),
          output(room),
          film(libdeflate_alloc_compressor(filmLevel)),
          drawing(libdeflate_alloc_compressor(drawingLevel)) {}

    bool complete() const {
        return rows.data() && sample.data() && filters.data() && output.data() && film && drawing;
    }
    PngRows image() const {
        return {rows.data(), static_cast<size_t>(width) * 3, static_cast<size_t>(height)};
    }
    struct Choice {
        bool filtered, drawing;
    };
    Choice choose();
    size_t packSample(libdeflate_compressor* compressor, bool filtered);

    const int width, height;
    const size_t bytes;  // of all rows, each with the byte of its filter
    const size_t room;
    PlatformBlock rows, sample, filters, output;
    Compressor film, drawing;
    size_t packed = 0;  // bytes of `output`
};

// The bytes of the sampled rows, packed.
size_t PngEncoder::Work::packSample(libdeflate_compressor* compressor, bool filtered) {
    const PngRows from = image();
    unsigned char* to = sample.data();
    for (size_t first = 0; first < from.height; first += group)
        for (size_t y = first; y < std::min(first + strip, from.height); ++y, to += from.stride())
            if (filtered)
                qvFilterRow(from, y, to, filters.data());
            else
                std::memcpy(to, from.row(y), from.stride());
    return libdeflate_zlib_compress(compressor, sample.data(), static_cast<size_t>(to - sample.data()),
                                    output.data(), room);
}

// Drawings and cards have long repeats, which a filter may cut to pieces. What is best for them shows at
// their own level.
PngEncoder::Work::Choice PngEncoder::Work::choose() {
    const size_t sampled = image().stride() * sampledRows(image().height);
    size_t plain = packSample(film.get(), false), filtered = packSample(film.get(), true);
    const bool isDrawing = std::min(plain, filtered) < sampled / drawingRatio;
    if (isDrawing) {
        plain = packSample(drawing.get(), false);
        filtered = packSample(drawing.get(), true);
    }
    return {filtered < plain, isDrawing};
}

PngEncoder::PngEncoder() = default;
PngEncoder::~PngEncoder() = default;

size_t PngEncoder::memoryFor(int width, int height) {
    const size_t bytes = (static_cast<size_t>(width) * 3 + 1) * static_cast<size_t>(height);
    return bytes + libdeflate_zlib_compress_bound(nullptr, bytes) + bytes / (group / strip);
}

bool PngEncoder::prepare(int width, int height) {
    if (width < 1 || height < 1) return false;
    if (work_ && work_->width == width && work_->height == height) return true;
    work_.reset(new (std::nothrow) Work(width, height));
    if (work_ && work_->complete()) return true;
    work_.reset();
    errno = ENOMEM;
    return false;
}

void PngEncoder::take(const QvFrame& picture) {
    const PngRows to = work_->image();
    for (size_t y = 0; y < to.height; ++y) {
        to.row(y)[0] = 0;
        qvSwapRedBlue(to.row(y) + 1, picture.pixelPtr(0, static_cast<int>(y)),
                      static_cast<size_t>(work_->width));
    }
}

void PngEncoder::compress() {
    Work& work = *work_;
    const PngRows rows = work.image();
    const auto choice = work.choose();
    if (choice.filtered)
        for (size_t y = rows.height; y-- > 0;) qvFilterRow(rows, y, rows.row(y), work.filters.data());
    work.packed = libdeflate_zlib_compress((choice.drawing ? work.drawing : work.film).get(),
                                           work.rows.data(), work.bytes, work.output.data(), work.room);
}

bool PngEncoder::write(std::FILE* file) {
    const Writer writer;
    if (!writer.info) {
        errno = ENOMEM;
        return false;
    }
    return writeJumping(writer.png, writer.info, file, static_cast<png_uint_32>(work_->width),
                        static_cast<png_uint_32>(work_->height), work_->output.data(), work_->packed);
}
