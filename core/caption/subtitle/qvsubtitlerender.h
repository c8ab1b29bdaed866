// Draws subtitles onto pictures.
//
//     QvSubtitleRender render;
//     render.init(options);                     // once
//     render.render(frame, subtitle, nullptr);  // for each frame
//
// Each line of text stands in a band L = charSize * 1.15 rows below the one before. Without a position the
// lines are centred, and the last one ends above the picture's lower edge:
//
//     top of the first band = height - charSize / 2 - L * rows
//
// "<i>", "<b>", "</i>" and "</b>" in a text change the face up to the end of the subtitle and are not drawn.
// "<u>", "<s>", "<font ...>", their ends, "{\...}" and "{y:...}", which other players know, are passed over.
// Text of right-to-left scripts is put in its order and shaped. A letter that a font does not have is drawn
// with another font of the system that has it. The options' "align" and "wrap" choose other places than the
// above.
#pragma once

#include <memory>
#include <string>

#include "core/arch/api.h"

class QvColor;
class QvFrame;
class QvSubtitle;
class QvSubtitles;
class QvTextRenderingOptions;

// One thread at a time; drawn text is kept, so that each further frame with it costs only the blending.
class QV_API QvSubtitleRender {
  public:
    QvSubtitleRender();
    QvSubtitleRender(const QvSubtitleRender&) = delete;
    QvSubtitleRender& operator=(const QvSubtitleRender&) = delete;
    ~QvSubtitleRender();

    // Loads the fonts. A font that can't be loaded is logged and draws nothing. 0, or -1 if
    // FreeType can't be used. May be called again with other options.
    int init(const QvTextRenderingOptions& options);

    // Looks for the fonts of all letters at once, which render would do as they come. Returns the letters
    // that no font of the system has, and which are drawn as the font's sign for that.
    std::u32string findFonts(const QvSubtitles& subtitles);

    // Draws in place, onto any format that QvFrame::blend knows. `color`: of the letters, white if null or
    // if it is YUV. The position counts if it lies within the picture; several lines go down from there.
    // 0; what can't be drawn is logged.
    int render(QvFrame& frame, const QvSubtitle& subtitle, const QvColor* color);

  private:
    struct Private;
    std::unique_ptr<Private> p_;
};
