// What the presets mean for the encoders: one row a preset and encoder.
#pragma once

namespace av {

// 0 and "" leave a setting as it is.
struct PresetVideo {
    const char* preset;  // symbol of the engine's, or name of the plug-in's own
    const char* module;
    const char* standard;
    int width, height;
    bool television;  // 50 Hz as stated, 60 Hz with height60
    int height60;
    double rate;
    int interlaced;
    double aspect;        // of the whole picture
    double target, most;  // bits a second; the second above the first: variable
    int n, m;
    unsigned type;  // FOURCC of the frames
    const char* codecProfile;
    int topLines;
    const char* options;
};
// Null if the preset says nothing to that encoder.
const PresetVideo* presetVideo(int profile, const char* module);

}  // namespace av
