#include "tarsel/picture/effects.h"

#include "tarsel/picture/sizes.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

std::string EffectOptions::given() const {
    const struct {
        const char* name;
        bool given;
    } all[] = {
        {"--size", !size.empty()},
        {"--fit", !fit.empty()},
        {"--rate", !rate.empty()},
        {"--pixel", !pixel.empty()},
        {"--matrix", !matrix.empty()},
        {"--deinterlace", !deinterlace.empty()},
        {"--crop", !crop.empty()},
        {"--flip", flip},
        {"--logo", !logos.empty()},
        {"--subtitles", !subtitles.empty()},
        {"--subtitle-style", !subtitleStyle.empty()},
        {"--timecode", !timecode.empty()},
        {"--fade", !fade.empty()},
    };
    for (const auto& option : all)
        if (option.given) return option.name;
    return "";
}

bool EffectOptions::any() const { return !given().empty() || !filters.empty(); }

void EffectOptions::check() const {
    if (!size.empty() && !fit.empty()) throw failure(Msg::optionsExclude, {"--size", "--fit"});
    if (!size.empty()) parseSizeOrShape(size, "--size");
    if (!fit.empty()) parseFit(fit);
    if (!rate.empty()) parseRate(rate, "--rate");
    if (!pixel.empty()) parsePixel(pixel, "--pixel");
}

const std::vector<std::string>& deinterlaceMethods() {
    static const std::vector<std::string> all = {"top", "bottom", "bob", "double", "reverse"};
    return all;
}

void addEffectOptions(Command& command, EffectOptions& options) {
    command.group("Picture");
    command.option("--size", options.size, "Size of the output; 1280x-1 and -1x720 keep the shape", "WxH");
    command.option("--fit", options.fit,
                   "The largest size in a box; bars fills the rest with black, crop cuts what is beyond it",
                   "WxH[,bars|crop]");
    command.option("--rate", options.rate, "Frames a second: 25, 30000/1001, 25i, pal, ntsc, film", "RATE",
                   {"pal", "ntsc", "film", "ntsc-film", "25i", "29.97i"});
    std::vector<std::string> pixels;
    for (const QvPixelFormat& format : qvPixelFormats()) pixels.push_back(fourccText(format.fourcc));
    command.option("--pixel", options.pixel, "Pixel format, see 'tarsel formats'", "FOURCC", pixels);
    command.option("--matrix", options.matrix, "YUV matrix of the output, or of input and output",
                   "[IN:]601|709", {"601", "709", "601:709", "709:601"});
    command.flagOrValue("--deinterlace", options.deinterlace,
                        "top (the default), bottom, bob, double or reverse", "[=METHOD]",
                        deinterlaceMethods());
    command.option("--crop", options.crop, "The part to keep; -X and -Y count from the right and the bottom",
                   "WxH[+X+Y]|W:H");
    command.flag("--flip", options.flip, "Turn the picture upside down");
    command.list("--logo", options.logos, "Draw a picture; -X and -Y count from the right and the bottom",
                 "FILE@X,Y[,OPACITY]");
    command.option("--subtitles", options.subtitles,
                   "Burn in the subtitles of an .srt or .sub file or of a film", "FILE");
    command.option(
        "--subtitle-style", options.subtitleStyle,
        "Keys size, color, font, effect, align, margin, wrap, encoding, delay, speed, rate, stream",
        "K=V,...");
    command.flagOrValue(
        "--timecode", options.timecode,
        "Burn in the timecode of the input, or from START on; keys start, mode=frames, x, y, size, "
        "color, font",
        "[=START|K=V,...]");
    command.option("--fade", options.fade, "Fade in from black for IN, and out to black for OUT, or IN again",
                   "IN[,OUT]");
    command.group("");
    command.list(
        "--filter", options.filters,
        "Any filter, see 'tarsel modules'; \\, and \\\\ stand for , and \\ in a value, lists are JSON",
        "NAME[:K=V,...]");
}
