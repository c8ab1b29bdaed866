// A font file at one size, with its glyphs kept once they have been drawn.
#pragma once

#include <memory>
#include <unordered_map>
#include <vector>

#include <ft2build.h>
#include FT_FREETYPE_H
#include FT_MODULE_H
#include <hb.h>

class Any;

// A drawn glyph. Its top left pixel stands at pen + left, baseline - top.
struct FontGlyph {
    int left = 0;
    int top = 0;
    int width = 0;
    int rows = 0;
    int advance = 0;                      // 1/64 pixels
    std::vector<unsigned char> coverage;  // width * rows, 0 to 255
};

// FreeType leaves out what it finds no memory for, so letters would be missing; where it makes the
// interpreter of a face's hints, version 2.12 writes through the null pointer. So it gets memory that keeps
// in mind whether it ran out, and that has a reserve for the interpreters of three faces.
class FontLibrary {
  public:
    FontLibrary();  // the outcome is in the debug log
    FontLibrary(const FontLibrary&) = delete;
    FontLibrary& operator=(const FontLibrary&) = delete;
    FT_Library get() const { return library_.get(); }  // null if FreeType can't be used

    // To be called after what may have taken memory: throws std::bad_alloc if there was none.
    void checkMemory();

  private:
    static FontLibrary& of(FT_Memory memory) { return *static_cast<FontLibrary*>(memory->user); }
    static void* take(FT_Memory memory, long size);
    static void* resize(FT_Memory memory, long oldSize, long size, void* block);
    static void release(FT_Memory memory, void* block);
    struct Done {
        void operator()(FT_Library library) const { FT_Done_Library(library); }
    };
    void* fromReserve(std::size_t size);
    bool isReserve(const void* block) const;

    std::unique_ptr<unsigned char[]> reserve_;
    std::size_t reserveUsed_ = 0;
    bool ranOut_ = false;
    FT_MemoryRec_ memory_{this, take, release, resize};
    std::unique_ptr<FT_LibraryRec_, Done> library_;
};

class FontFace {
  public:
    static constexpr int largestSize = 4096;  // pixels; a letter of it covers the largest pictures

    // A failure is logged and leaves the face without glyphs. The library has to outlive it.
    // `pixels`: the height of a letter; its width is divided by `pixelAspect`. `number`: of the face in a
    // file that holds several.
    void load(FontLibrary& library, const Any& file, int pixels, double pixelAspect = 1, int number = 0);
    bool usable() const { return face_ != nullptr; }

    unsigned indexOf(char32_t character) const;  // 0 if the font does not have it
    const FontGlyph& glyph(unsigned index);      // empty if it can't be drawn
    // What moves the second glyph towards the first, in 1/64 pixels; never positive.
    int kerning(unsigned first, unsigned second) const;
    hb_font_t* shaper();  // null if there is none

  private:
    struct FaceDone {
        void operator()(FT_Face face) const { FT_Done_Face(face); }
    };
    struct ShaperDone {
        void operator()(hb_font_t* font) const { hb_font_destroy(font); }
    };
    void draw(unsigned index, FontGlyph& glyph);

    FontLibrary* library_ = nullptr;
    std::unique_ptr<FT_FaceRec_, FaceDone> face_;
    std::unique_ptr<hb_font_t, ShaperDone> shaper_;
    std::unordered_map<unsigned, FontGlyph> glyphs_;
};
