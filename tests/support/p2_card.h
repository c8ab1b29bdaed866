// Clips as P2 cards hold them, in a folder of the test, with essence for the decoder of mxf_decoder.h.
#pragma once

#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

struct P2CardClip {
    std::string name = {};
    int frames = 5, seed = 0;
    std::vector<int> samples{9600, 9600};  // of each sound, whose seeds are 1000, 2000, ...
    std::string previous = {}, next = {};  // names of other clips
    std::string timecode = "01:02:03:04";
    int duration = 0;  // that the document says, in frames at 25 a second; 0: nothing
};

inline void writeText(const std::filesystem::path& name, const std::string& text) {
    std::filesystem::create_directories(name.parent_path());
    std::ofstream(name, std::ios::binary) << text;
}

// Returns the name of the document.
inline std::string writeP2Clip(const std::filesystem::path& card, const P2CardClip& clip) {
    const std::filesystem::path contents = card / "CONTENTS";
    const auto id = [](const std::string& name) { return "<GlobalClipID>ID-" + name + "</GlobalClipID>"; };
    std::string text =
        "<?xml version=\"1.0\"?>\n<P2Main xmlns=\"urn:clip\"><ClipContent>\n<ClipName>" + clip.name +
        "</ClipName>" + id(clip.name) +
        (clip.duration ? "<Duration>" + std::to_string(clip.duration) + "</Duration><EditUnit>1/25</EditUnit>"
                       : "") +
        "<EssenceList><Video><StartTimecode>" + clip.timecode + "</StartTimecode></Video>";
    for (std::size_t i = 0; i < clip.samples.size(); ++i) {
        text += "<Audio/>";
        writeText(contents / "AUDIO" / (clip.name + (i < 10 ? "0" : "") + std::to_string(i) + ".MXF"),
                  "audio " + std::to_string(clip.samples[i]) + " " + std::to_string(1000 * (i + 1)));
    }
    text +=
        "</EssenceList><ClipMetadata><UserClipName> Two geese </UserClipName></ClipMetadata>"
        "<Relation><Connection>";
    if (!clip.previous.empty()) text += "<Previous>" + id(clip.previous) + "</Previous>";
    if (!clip.next.empty()) text += "<Next>" + id(clip.next) + "</Next>";
    text += "</Connection></Relation></ClipContent></P2Main>";
    writeText(contents / "VIDEO" / (clip.name + ".MXF"),
              "video " + std::to_string(clip.frames) + " " + std::to_string(clip.seed));
    writeText(contents / "CLIP" / (clip.name + ".XML"), text);
    return (contents / "CLIP" / (clip.name + ".XML")).string();
}
