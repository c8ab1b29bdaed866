// Burns a running timecode or frame number into the picture (module "timecode").
//
//     name                type           default            meaning
//     "mode"              int or string  "Timecode"         1 is "Timecode", any other number "Frame number"
//     "start"             string         "FirstInputFrame"  that frame counts as 0; "InPoint": frames keep
//                                                           the numbers that they come with
//     "startOffset"       int            0                  subtracted from the number
//     "dropFrame"         int            -1                 1: drop-frame timecode, 0: none, -1: as the rate
//                                                           says; only 29.97 and 59.94 have it
//     "font_filename"     path           the sans font      of all three faces
//     "colorR", "colorG", "colorB"       255                0 to 255
//     "positionX", "positionY"           -1                 pixels from the top left corner; an x of -1
//                                                           means the default place, else both count
//     "renderingOptions"  dictionary     empty              a stored QvTextRenderingOptions; its fonts go
//                                                           before "font_filename"
//
// A timecode is of the frame's own rate and ends with "*", on interlaced frames in the
// upper field only. Below 0 it counts back from 24 hours, as tape does; a frame number is negative then.
//
// Unless the rendering options say so, the letters are h / 10 * 7 / 8 pixels high, at least 14, in a picture
// of h lines. The default place is (w * 35 / 100, h - size * 3 / 2).
#pragma once

#include "builtin/video/overlay/overlay.h"
#include "core/caption/subtitle/qvsubtitlerender.h"
#include "core/caption/subtitle/qvsubtitles.h"
#include "core/value/anycontainer.h"

struct TimecodeSettings {
    bool asTimecode = true;
    bool fromFirstFrame = true;
    int startOffset = 0;
    int dropFrame = -1;
    std::string font;
    int red = 255, green = 255, blue = 255;
    int x = -1, y = -1;
    AnyDict renderingOptions;
};

class TimecodeWriter : public OverlayOf<TimecodeSettings> {
  public:
    TimecodeWriter();

    int open() override;

  protected:
    int draw(QvFrame& frame) override;

  private:
    int prepare(int pictureHeight);
    int numberOf(const QvFrame& frame);
    void setText(const QvFrame& frame, int number);
    void setFieldMasks(bool interlaced, int characters);

    QvSubtitleRender render_;
    int height_ = 0;  // of the pictures that the renderer has been made for; 0: it has not
    int charSize_ = 0;
    bool counting_ = false;
    int first_ = 0;
    QvSubtitle line_;
};
