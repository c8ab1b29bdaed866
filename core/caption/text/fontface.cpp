#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <memory>
#include <new>
#include <string>
#include <utility>

#include <hb-ft.h>

#include "core/arch/platform.h"
#include "core/caption/text/fontface_p.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/log/qvlog.h"
#include "core/value/any.h"

namespace {

constexpr std::size_t reserveBytes = 32768;  // an interpreter takes 7 KB

// Rows of a bitmap, whose pitch is negative where the last row comes first.
const unsigned char* rowOf(const FT_Bitmap& bitmap, int row) {
    const auto rows = static_cast<int>(bitmap.rows);
    const unsigned char* first =
        bitmap.pitch >= 0 ? bitmap.buffer : bitmap.buffer - bitmap.pitch * (rows - 1);
    return first + static_cast<std::ptrdiff_t>(row) * bitmap.pitch;
}

unsigned char coverageAt(const FT_Bitmap& bitmap, const unsigned char* row, int x) {
    if (bitmap.pixel_mode == FT_PIXEL_MODE_MONO) return row[x / 8] & (0x80 >> x % 8) ? 255 : 0;
    return row[x];
}

void copyBitmap(const FT_Bitmap& bitmap, FontGlyph& glyph) {
    if (bitmap.pixel_mode != FT_PIXEL_MODE_GRAY && bitmap.pixel_mode != FT_PIXEL_MODE_MONO) return;
    glyph.width = static_cast<int>(bitmap.width);
    glyph.rows = static_cast<int>(bitmap.rows);
    glyph.coverage.resize(static_cast<std::size_t>(glyph.width) * static_cast<std::size_t>(glyph.rows));
    auto out = glyph.coverage.begin();
    for (int y = 0; y < glyph.rows; ++y)
        for (int x = 0; x < glyph.width; ++x) *out++ = coverageAt(bitmap, rowOf(bitmap, y), x);
}

// Null if the file can't be opened or has no length. FreeType calls `close`, whatever becomes of the face.
FT_Stream openFont(const char* name) {
    QvPlatform& platform = qv_platform();
    QvFileStatus status;
    if (!platform.status(name, status) || status.size <= 0) return nullptr;
    auto stream = std::make_unique<FT_StreamRec>();
    errno = 0;
    std::FILE* file = platform.openFile(name, "rb");
    if (!file && errno == ENOMEM) throw std::bad_alloc();  // not a font that is missing
    if (!file) return nullptr;
    stream->size = static_cast<unsigned long>(status.size);
    stream->descriptor.pointer = file;
    // A count of 0 only moves; the result is 0 for success then.
    stream->read = [](FT_Stream self, unsigned long offset, unsigned char* to,
                      unsigned long count) -> unsigned long {
        auto* from = static_cast<std::FILE*>(self->descriptor.pointer);
        const bool moved = qv_platform().seek(from, static_cast<long long>(offset), SEEK_SET) == 0;
        if (count == 0) return moved ? 0 : 1;
        return moved ? std::fread(to, 1, count, from) : 0;
    };
    stream->close = [](FT_Stream self) {
        std::fclose(static_cast<std::FILE*>(self->descriptor.pointer));
        delete self;
    };
    return stream.release();
}

FT_Error openFace(FT_Library library, const char* name, int number, FT_Face& face) {
    if (!library) return FT_Err_Invalid_Library_Handle;
    FT_Open_Args source{};
    source.flags = FT_OPEN_STREAM;
    source.stream = openFont(name);
    return source.stream ? FT_Open_Face(library, &source, number, &face)
                         : FT_Error(FT_Err_Cannot_Open_Resource);
}

}  // namespace

FontLibrary::FontLibrary() : reserve_(std::make_unique_for_overwrite<unsigned char[]>(reserveBytes)) {
    FT_Library library = nullptr;
    if (FT_New_Library(&memory_, &library) != 0) {
        checkMemory();
        qv_dbg()->error("Failed to initialize freetype library");
        return;
    }
    library_.reset(library);
    FT_Add_Default_Modules(library);
    FT_Set_Default_Properties(library);
    checkMemory();
    int major = 0, minor = 0, patch = 0;
    FT_Library_Version(library, &major, &minor, &patch);
    qv_dbg()->info("Freetype library version %d.%d.%d initialized", major, minor, patch);
}

void* FontLibrary::take(FT_Memory memory, long size) {
    void* block = std::malloc(static_cast<std::size_t>(size));
    return block ? block : of(memory).fromReserve(static_cast<std::size_t>(size));
}

void* FontLibrary::resize(FT_Memory memory, long oldSize, long size, void* block) {
    FontLibrary& library = of(memory);
    const bool reserved = library.isReserve(block);
    const auto bytes = static_cast<std::size_t>(size);
    void* moved = reserved ? std::malloc(bytes) : std::realloc(block, bytes);
    const bool copies = reserved || !moved;
    if (!moved) moved = library.fromReserve(bytes);
    if (moved && copies) std::memcpy(moved, block, static_cast<std::size_t>(std::min(oldSize, size)));
    if (moved && copies && !reserved) std::free(block);
    return moved;
}

void FontLibrary::release(FT_Memory memory, void* block) {
    if (!of(memory).isReserve(block)) std::free(block);
}

void* FontLibrary::fromReserve(std::size_t size) {
    ranOut_ = true;
    constexpr std::size_t step = alignof(std::max_align_t);
    if (size > reserveBytes - reserveUsed_) return nullptr;
    void* block = reserve_.get() + reserveUsed_;
    reserveUsed_ += std::min((size + step - 1) / step * step, reserveBytes - reserveUsed_);
    return block;
}

bool FontLibrary::isReserve(const void* block) const {
    const std::less<const void*> before;
    return !before(block, reserve_.get()) && before(block, reserve_.get() + reserveBytes);
}

void FontLibrary::checkMemory() {
    if (std::exchange(ranOut_, false)) throw std::bad_alloc();
}

void FontFace::load(FontLibrary& library, const Any& file, int pixels, double pixelAspect, int number) {
    glyphs_.clear();
    shaper_.reset();
    face_.reset();
    library_ = &library;
    const std::string name = qv_os_name(file);
    FT_Face face = nullptr;
    const FT_Error error = openFace(library.get(), name.c_str(), number, face);
    if (error != 0) {
        library.checkMemory();
        if (error == FT_Err_Unknown_File_Format)
            qv_dbg()->info("Unsupported font type");
        else
            qv_dbg()->info("Failed to load font file '%s'", name.c_str());
        return;
    }
    face_.reset(face);
    library.checkMemory();
    if (FT_Select_Charmap(face, FT_ENCODING_UNICODE) != 0)
        qv_dbg()->info("Error: no unicode symbols in font file %s", name.c_str());
    const auto size = static_cast<FT_F26Dot6>(pixels) * 64;
    const auto width = static_cast<FT_F26Dot6>(std::lround(static_cast<double>(size) / pixelAspect));
    const bool sized = pixels <= largestSize && FT_Set_Char_Size(face, width, size, 0, 0) == 0;
    library.checkMemory();
    if (sized) return;
    qv_dbg()->info("Error setting char size to: %dpt 72dpi (default)", pixels);
    face_.reset();
}

unsigned FontFace::indexOf(char32_t character) const {
    return face_ ? FT_Get_Char_Index(face_.get(), character) : 0;
}

const FontGlyph& FontFace::glyph(unsigned index) {
    if (const auto known = glyphs_.find(index); known != glyphs_.end()) return known->second;
    FontGlyph glyph;
    draw(index, glyph);
    return glyphs_.try_emplace(index, std::move(glyph)).first->second;
}

void FontFace::draw(unsigned index, FontGlyph& glyph) {
    if (!face_) return;
    const bool loaded = FT_Load_Glyph(face_.get(), index, FT_LOAD_RENDER) == 0;
    library_->checkMemory();
    if (!loaded) return;
    const FT_GlyphSlot slot = face_->glyph;
    glyph.left = slot->bitmap_left;
    glyph.top = slot->bitmap_top;
    glyph.advance = static_cast<int>(slot->advance.x);
    copyBitmap(slot->bitmap, glyph);
}

int FontFace::kerning(unsigned first, unsigned second) const {
    FT_Vector move{};
    if (!face_ || !FT_HAS_KERNING(face_.get()) || first == 0 || second == 0) return 0;
    if (FT_Get_Kerning(face_.get(), first, second, FT_KERNING_DEFAULT, &move) != 0) return 0;
    return static_cast<int>(std::min<FT_Pos>(move.x, 0));
}

hb_font_t* FontFace::shaper() {
    if (!shaper_ && face_) shaper_.reset(hb_ft_font_create_referenced(face_.get()));
    return shaper_.get();
}
