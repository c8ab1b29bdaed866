#include "tarsel/sound/soundoptions.h"

#include "tarsel/sound/channelmap.h"
#include "tarsel/sound/soundeffects.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/messages.h"

std::string SoundOptions::given() const {
    const struct {
        const char* name;
        bool given;
    } all[] = {
        {"--volume", !volumes.empty()}, {"--delay", !delay.empty()},   {"--normalize", !normalize.empty()},
        {"--map", !map.empty()},        {"--dither", !dither.empty()},
    };
    for (const auto& option : all)
        if (option.given) return option.name;
    return "";
}

void SoundOptions::check() const {
    // The one gain would undo the other.
    if (!volumes.empty() && !normalize.empty())
        throw failure(Msg::optionsExclude, {"--volume", "--normalize"});
    parseVolumes(volumes);
    if (!normalize.empty()) parseTarget(normalize);
    if (!map.empty()) parseChannelMap(map);
}

void addSoundOptions(Command& command, SoundOptions& options) {
    command.group("Sound");
    command.list("--volume", options.volumes,
                 "Make the sound louder, or softer with a minus; a:N= is one of several sounds, from 0 on",
                 "[a:N=]DB");
    command.flagOrValue("--normalize", options.normalize,
                        "Bring the loudness to LUFS (-23 by default), or the peak or the RMS to dBFS",
                        "[=[loudness|peak|rms:]LEVEL]", {"-23", "-16", "peak:-1", "rms:-20"});
    command.option("--delay", options.delay, "Let the sound come later, or earlier with a minus: SS.mmm, 3f",
                   "TIME");
    command.option(
        "--map", options.map,
        "The channels of the output, each IN, the mean of IN+IN, or - for silence; a:1.0 is channel "
        "0 of sound 1",
        "OUT,OUT,...");
    command.choice("--dither", options.dither,
                   "Noise where the sound is rounded to 16 or 8 bits; triangular by default",
                   {"triangular", "none"});
    command.group("");
}
