// What --vcodec and --acodec ask for: an encoder, and what it is set to.
#pragma once

#include <string>
#include <utility>
#include <vector>

struct CodecWords {
    bool given() const { return !name.empty(); }
    // As it was typed, for messages: "--vcodec h264".
    std::string typed() const { return option + " " + name; }

    std::string option, name;          // the name as it was typed; empty when there was none
    int type = 0;                      // qvVideoStream or qvAudioStream
    bool none = false;                 // there are to be no such streams
    std::vector<std::string> modules;  // installed encoders that do, the preferred one first; never empty,
                                       // unless `none`
    std::string preset;                // symbol of the one to prefer; empty for any
    std::vector<std::pair<std::string, std::string>> settings;
};

// Of "NAME[:key=value,...]", where NAME is a codec's or a module's, or "none"; empty text gives no words.
// Throws Failure for a name that means nothing (with near ones), and for a codec whose modules are missing.
CodecWords parseCodec(const std::string& text, int type);
