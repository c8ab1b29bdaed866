// File names that mean a pixel format: what a raw file has in it by its extension. The engine itself opens
// and writes raw files of any name in any format; that a name has a meaning is the tool's rule, so that a
// file is read as what it was written as.
#pragma once

#include <span>
#include <string>
#include <string_view>

struct RawName {
    std::string_view extension;  // without the dot, in small letters
    unsigned fourcc;             // 0: any format; an option names it
    const char* bytes;           // what a pixel or a group of pixels looks like in the file
};

// Names that don't say in which order the bytes are.
struct OpenName {
    std::string_view extension;
    const char* instead;  // extensions, with dots
};

std::span<const RawName> rawNames();
std::span<const OpenName> openNames();

// The row of a file's extension, or null.
const RawName* rawName(std::string_view extension);
const OpenName* openName(std::string_view extension);

// "ext" of "a/b.EXT"; "" without.
std::string extensionOf(const std::string& file);

// Whether a file of this name may hold this format. Of a file that is read, ".yuv" may be any YUV: others
// write it for all of them.
bool nameAllows(const RawName& name, unsigned fourcc, bool reading);
// The extension, with its dot, that a file of this format is written with.
std::string extensionFor(unsigned fourcc);

// YUV or grey.
bool isYuv(unsigned fourcc);
