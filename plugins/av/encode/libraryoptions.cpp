#include "plugins/av/encode/libraryoptions.h"

#include <algorithm>
#include <span>
#include <string_view>
#include <vector>

#include "plugins/av/source/optionlist.h"

namespace av {

namespace {

// In a name, or in the parameters of the codec that have a syntax of their own.
constexpr std::string_view filed[] = {"stats", "file", "dump",  "csv",     "recon", "analysis", "clbin",
                                      "cqm",   "log",  "zones", "scaling", "rpu",   "load",     "save"};
// What the parameters of the encoder decide, and its buffers and heads rely on.
constexpr std::string_view owned[] = {
    "ar",          "ac",         "channel_layout", "ch_layout",   "frame_size", "time_base",  "threads",
    "thread_type", "video_size", "pixel_format",   "field_order", "colorspace", "color_range"};
// The same inside the codec's own syntax.
constexpr std::string_view ownedThere[] = {"pass",    "input", "output", "annexb",    "repeat-headers",
                                           "threads", "pools", "fps",    "interlace", "field"};
constexpr int ownedFlags = AV_CODEC_FLAG_PASS1 | AV_CODEC_FLAG_PASS2 | AV_CODEC_FLAG_GLOBAL_HEADER;

// Of the codec, with a syntax of its own.
bool isParameters(std::string_view name) { return name.ends_with("-params") || name == "x264opts"; }

bool contains(std::span<const std::string_view> words, std::string_view text) {
    return std::any_of(words.begin(), words.end(),
                       [text](std::string_view word) { return text.find(word) != text.npos; });
}

bool namesFile(std::string_view name, std::string_view value) {
    return (name != "profile" && contains(filed, name)) || (isParameters(name) && contains(filed, value));
}

bool isOwned(std::string_view name, std::string_view value) {
    return std::find(std::begin(owned), std::end(owned), name) != std::end(owned) ||
           (isParameters(name) && contains(ownedThere, value));
}

std::string unknown(const AVCodecContext& context, const std::string& name) {
    const std::string near = similarNames(
        name, writingOptions({context.av_class, context.codec ? context.codec->priv_class : nullptr}));
    return "there is no option '" + name + "'" + (near.empty() ? "" : "; do you mean " + near + "?");
}

int put(AVCodecContext& context, const char* name, const char* value) {
    return checked(av_opt_set(&context, name, value, AV_OPT_SEARCH_CHILDREN));
}

}  // namespace

std::string setOptions(AVCodecContext& context, const std::string& options) {
    if (options.empty()) return "";
    OptionList given;
    if (!given.parse(options)) return "'" + options + "' is not of the form name=value:name=value";
    const AVDictionaryEntry* entry = nullptr;
    while ((entry = given.next(entry))) {
        if (namesFile(entry->key, entry->value))
            return std::string("option '") + entry->key + "' names a file, which is not allowed";
        const int flags = context.flags & ownedFlags;
        const bool refused = isOwned(entry->key, entry->value);
        const int set = refused ? 0 : put(context, entry->key, entry->value);
        if (refused || (context.flags & ownedFlags) != flags)
            return std::string("option '") + entry->key + "=" + entry->value +
                   "' is what the encoder's own parameters decide";
        if (set == AVERROR_OPTION_NOT_FOUND) return unknown(context, entry->key);
        if (set < 0) return std::string("option '") + entry->key + "' can't be '" + entry->value + "'";
    }
    return "";
}

bool setOption(AVCodecContext& context, const char* name, const std::string& value) {
    return put(context, name, value.c_str()) >= 0;
}

bool addParameters(AVCodecContext& context, const char* name, const std::string& parameters) {
    OptionList all;
    return checked(av_opt_get_dict_val(&context, name, AV_OPT_SEARCH_CHILDREN, all.raw())) >= 0 &&
           all.parse(parameters) &&
           checked(av_opt_set_dict_val(&context, name, *all.raw(), AV_OPT_SEARCH_CHILDREN)) >= 0;
}

std::string checkOptions(const AVCodec& codec, const std::string& options) {
    const CodecPtr context(avcodec_alloc_context3(&codec));
    return context ? setOptions(*context, options) : "there is no memory";
}

}  // namespace av
