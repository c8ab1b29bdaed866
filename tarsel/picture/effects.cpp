#include "tarsel/picture/effects.h"

#include "tarsel/words/timespec.h"

std::string EffectOptions::given() const {
    const struct {
        const char* name;
        bool given;
    } all[] = {
        {"--size", !size.empty()},
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
    if (!size.empty()) parseSize(size, "--size");
    if (!rate.empty()) parseRate(rate, "--rate");
    if (!pixel.empty()) parsePixel(pixel, "--pixel");
}

void addEffectOptions(CLI::App& command, EffectOptions& options) {
    const auto text = [&](const char* names, std::string& value, const char* help, const char* type) {
        command.add_option(names, value, help)->type_name(type)->group("Picture");
    };
    const auto flag = [&](const char* names, std::string& value, const char* help, const char* type) {
        command.add_flag(names, value, help)->type_name(type)->group("Picture");
    };
    text("--size", options.size, "Size of the output", "WxH");
    text("--rate", options.rate, "Frames a second: 25, 30000/1001, 25i", "RATE");
    text("--pixel", options.pixel, "Pixel format, see 'tarsel formats'", "FOURCC");
    text("--matrix", options.matrix, "YUV matrix of the output, or of input and output", "[IN:]601|709");
    flag("--deinterlace", options.deinterlace, "top (unless said), bottom, bob, double or reverse",
         "[=METHOD]");
    text("--crop", options.crop, "The part to keep; -X and -Y count from the right and the bottom",
         "WxH[+X+Y]|W:H");
    command.add_flag("--flip", options.flip, "Turn the picture upside down")->group("Picture");
    command
        .add_option("--logo", options.logos, "Draw a picture; -X and -Y count from the right and the bottom")
        ->type_name("FILE@X,Y[,OPACITY]")
        ->allow_extra_args(false)
        ->group("Picture");
    text("--subtitles", options.subtitles, "Burn in the subtitles of an .srt or .sub file", "FILE");
    text("--subtitle-style", options.subtitleStyle,
         "Keys size, color, font, effect, encoding, delay, speed, rate", "K=V,...");
    flag("--timecode", options.timecode,
         "Burn in the timecode of the input, or from START on; keys start, mode=frames, x, y, size, color, "
         "font",
         "[=START|K=V,...]");
    text("--fade", options.fade, "Fade in from black over IN, and to black over OUT, or IN as well",
         "IN[,OUT]");
    command
        .add_option("--filter", options.filters,
                    "Any filter, see 'tarsel modules'; \\, and \\\\ stand for , and \\ in a value")
        ->type_name("NAME[:K=V,...]")
        ->allow_extra_args(false);
}
