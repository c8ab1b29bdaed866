// The extensions of the files that "avdec" is tried for. None is here that the engine's own readers of raw
// pictures, texts and documents have.
#pragma once

namespace av {

inline constexpr const char* extensions[] = {
    // Films.
    "mp4", "mov", "m4v", "qt", "3gp", "3g2", "mj2", "mkv", "webm", "avi", "mxf", "ts", "m2ts", "mts", "m2t",
    "mpg", "mpeg", "vob", "ps", "dv", "dif", "gxf", "ogg", "ogv", "flv", "f4v", "y4m", "asf", "wmv", "nut",
    "ivf", "wtv",
    // Streams of pictures without a container.
    "264", "h264", "avc", "265", "h265", "hevc", "mpv", "m2v", "m1v", "mjpeg", "mjpg", "obu", "vc1",
    // Sound.
    "mp3", "mp2", "m4a", "aac", "flac", "ac3", "eac3", "opus", "oga", "spx", "aif", "aiff", "aifc", "caf",
    "w64", "wav", "au", "amr", "mka", "wma", "wv", "tta", "dts", "thd", "ape",
    // Pictures.
    "png", "jpg", "jpeg", "tif", "tiff", "dpx", "exr"};

}  // namespace av
