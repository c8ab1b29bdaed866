// The animated logo (module "animatedlogo"): lays a movie over the frames, one of its frames over each.
//
// Parameters:
//
//     "filename"            the movie
//     "decoder"             the module that opens it; empty: the one for its extension
//     "decoderParams" Dict  set on the open decoder, as the format of a raw file; as text, with ";" between:
//                           FOURCC=BGRA;width=64;height=64
//     "xpos", "ypos"   0    as of the module "logo": pixels from the frame's left and top edges to the
//                           logo's; negative: from the right and lower edges
//     "alpha"          1    opacity of all of it, 0 to 1
//     "scale"          100  percent of the movie's size, 1 to 1000
//     "loop"           0    1: begins again at its end; 0: its last frame stays
//
// The alpha of BGRA, ARGB and b64a movies is straight and counts; all others cover. It is mixed in as by the
// module "logo". If the movie can't be read further, its last picture stays, with a warning. Works in place,
// on all formats. open fails without a movie that has a picture.
#pragma once

#include <memory>
#include <string>

#include "builtin/video/inplaceeffect.h"
#include "builtin/video/overlay/pictureoverlay.h"
#include "core/filter/qvcolorconvert.h"

class QvDecodePipe;

struct AnimatedLogoSettings {
    std::string filename, decoder;
    AnyDict decoderParams;
    int x = 0, y = 0;
    double alpha = 1, scale = 100;
    bool loop = false;
};

class AnimatedLogo : public InPlaceEffectOf<AnimatedLogoSettings> {
  public:
    AnimatedLogo();
    ~AnimatedLogo() override;
    int open() override;
    int close() override;

  protected:
    int change(const QvFrame& from, QvFrame& to) override;

  private:
    int openMovie();
    int openScaler();
    bool readNext();
    int takePicture();

    std::unique_ptr<QvDecodePipe> movie_;
    std::unique_ptr<QvCodec> scaler_;
    std::unique_ptr<QvColorConverter> toBgra_;
    QvFrame multiplied_;                // BGRA of the movie's size
    const QvFrame* picture_ = nullptr;  // the present one, BGRA over black: multiplied_ or the scaler's
    PictureOverlay overlay_;
    int width_ = 0, height_ = 0;  // of the logo
    bool alpha_ = false;          // the movie has one
    bool ended_ = false;          // the present picture stays
};
