// Burns a subtitle file into the picture (module "subtitle", which is not registered by itself).
//
//     name                 type       default  meaning
//     "subtitle_filename"  path       ""       an "srt" or "sub" file, with "normalize" also
//                                              a film; "": nothing is drawn
//     "subtitle_stream"    int        0        with "normalize": which subpicture stream of a film
//     "font_filename"      path       ""       of all three faces; "": the sans fonts of the system
//     "font_family"        string     ""       replaces "font_filename" if the system has such a font
//     "font_size"          int        32       pixels, 1 to 4096
//     "speed"              double     1.0      of the subtitles' clock against the picture's, from 0 on
//     "delay"              double     0.0      ms by which the subtitles come later
//     "encoding"           int        0        of a file without byte order mark: 0 ASCII, 1 UTF-8, 2 UTF-16,
//                                              3 UTF-32, from 4 on the number of a code page
//     "encodingRange"      list       -        read only: Dicts of "name" and "identifier" to choose from
//     "framerate"          framerate  -        of the frame numbers in a "sub" file; the picture's if not set
//     "fontEffect"         int        0        0 to 3
//     "fontEffectRange"    list       -        read only: the same for "No effect", "Outline", ...
//     "pixelAspect"        double     1.0      width to height of the picture's pixels, 0.1 to 10
//     "normalize"          bool       false    reads the file with QvSubtitles::readFile: for files of any
//                                              origin, unknown encoding, or times of another form
//     "wrap"               bool       false    lines wider than the picture, less the margins, become several
//     "align"              int        0        0: by the size of the letters; 1 to 9: within the margins, as
//                                              on the keys of numbers, 2 at the bottom; see "align" of
//                                              QvTextRenderingOptions
//     "marginX", "marginY" int        0        pixels, with "align" or "wrap"
//     "color"              int        white    0xRRGGBB
//     "colorR", "colorG", "colorB"    255      its bytes
//     "format"             int        0        read only: 1 SRT, 2 SUB, 0 while no file is loaded
//     "paramSet"           list       -        read only: descriptions for a user interface
//
// A frame shows the entry of the file at (frame time in seconds) * speed - delay / 1000.
//
// open is -9 if the file can't be read or is no subtitle file.
#pragma once

#include <optional>

#include "builtin/video/overlay/overlay.h"
#include "core/caption/subtitle/qvsubtitlerender.h"
#include "core/caption/subtitle/qvsubtitles.h"

struct SubtitleSettings {
    std::string file, font, family;
    int stream = 0;
    int fontSize = 32;
    double speed = 1.0;
    double delay = 0.0;
    int encoding = 0;
    Any framerate;
    int fontEffect = 0;
    double pixelAspect = 1;
    bool normalize = false, wrap = false;
    int align = 0, marginX = 0, marginY = 0;
    int color = 0xFFFFFF;
};

class SubtitleWriter : public OverlayOf<SubtitleSettings> {
  public:
    SubtitleWriter();

    void getParam(const char* name, Any& value) const override;
    int open() override;
    int close() override;

    using OverlayOf::getParam;

  protected:
    int draw(QvFrame& frame) override;

  private:
    int load();
    int readFile(QvSubtitles& read);

    std::optional<QvSubtitles> subtitles_;
    QvSubtitleRender render_;
    bool rateKnown_ = false;  // at which the file's frame numbers count
};
