// The faces that a text is drawn with: one for each style, and other fonts for letters that these do not
// have.
#pragma once

#include <array>
#include <cstddef>
#include <deque>
#include <string>
#include <string_view>
#include <unordered_set>

#include "core/caption/text/fontface_p.h"

enum class FontStyle { regular, italic, bold };
constexpr std::size_t fontStyles = 3;

class FontFaces {
  public:
    // In the order of FontStyle.
    FontFace& operator[](std::size_t style) { return styled_[style]; }
    auto begin() { return styled_.begin(); }
    auto end() { return styled_.end(); }

    // From now on fonts of this size are looked for where a letter has none. The library has to outlive them.
    void fallBack(FontLibrary& library, int pixels, double pixelAspect);

    // The face that has all letters of a cluster (a letter and its marks), or null.
    FontFace* faceOf(std::u32string_view cluster, FontStyle style);

    // Letters without a font by style; each is there once.
    class Missing {
      public:
        void add(char32_t letter, FontStyle style);
        const std::u32string& of(std::size_t style) const { return letters_[style]; }

      private:
        std::array<std::u32string, fontStyles> letters_;
        std::array<std::unordered_set<char32_t>, fontStyles> known_;
    };
    // Adds what of a cluster has no face yet and has not been looked for.
    void collect(std::u32string_view cluster, FontStyle style, Missing& missing);
    // Loads the fonts that have the letters, if there are any.
    void find(const Missing& missing);
    // Letters that were looked for and that no font of the system has, in the order in which they were.
    const std::u32string& absent() const { return absentInOrder_; }

  private:
    FontLibrary* library_ = nullptr;
    int pixels_ = 0;
    double pixelAspect_ = 1;
    std::array<FontFace, fontStyles> styled_;
    std::array<std::deque<FontFace>, fontStyles> others_;  // placed glyphs point to them
    std::unordered_set<char32_t> absent_;
    std::u32string absentInOrder_;

    FontFace* otherWith(std::u32string_view cluster, std::size_t style);
};
