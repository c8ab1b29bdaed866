#include "plugins/av/encode/libraryoptions.h"

#include <algorithm>
#include <span>
#include <string_view>
#include <vector>

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

int distance(std::string_view a, std::string_view b) {
    std::vector<int> row(b.size() + 1);
    for (std::size_t j = 0; j <= b.size(); ++j) row[j] = static_cast<int>(j);
    for (std::size_t i = 1; i <= a.size(); ++i) {
        int diagonal = row[0];
        row[0] = static_cast<int>(i);
        for (std::size_t j = 1; j <= b.size(); ++j) {
            const int change = diagonal + (a[i - 1] == b[j - 1] ? 0 : 1);
            diagonal = row[j];
            row[j] = std::min({row[j] + 1, row[j - 1] + 1, change});
        }
    }
    return row.back();
}

void collectNear(const void* object, std::string_view name, std::vector<std::string>& near) {
    const AVOption* option = nullptr;
    while (object && (option = av_opt_next(object, option)))
        if (option->type != AV_OPT_TYPE_CONST && (option->flags & AV_OPT_FLAG_ENCODING_PARAM) &&
            distance(option->name, name) <= 2)
            near.emplace_back(option->name);
}

std::string unknown(AVCodecContext& context, const std::string& name) {
    std::vector<std::string> near;
    if (name.size() < 64) {
        collectNear(&context, name, near);
        if (context.codec && context.codec->priv_class) collectNear(context.priv_data, name, near);
    }
    std::string text = "there is no option '" + name + "'";
    for (std::size_t i = 0; i < near.size() && i < 3; ++i)
        text += (i == 0 ? "; do you mean '" : "', '") + near[i];
    return near.empty() ? text : text + "'?";
}

struct FreeDictionary {
    AVDictionary* all = nullptr;
    ~FreeDictionary() { av_dict_free(&all); }
};

}  // namespace

std::string setOptions(AVCodecContext& context, const std::string& options) {
    if (options.empty()) return "";
    FreeDictionary given;
    if (av_dict_parse_string(&given.all, options.c_str(), "=", ":", 0) < 0)
        return "'" + options + "' is not of the form name=value:name=value";
    const AVDictionaryEntry* entry = nullptr;
    while ((entry = av_dict_get(given.all, "", entry, AV_DICT_IGNORE_SUFFIX))) {
        if (namesFile(entry->key, entry->value))
            return std::string("option '") + entry->key + "' names a file, which is not allowed";
        const int flags = context.flags & ownedFlags;
        const bool refused = isOwned(entry->key, entry->value);
        const int set = refused ? 0 : av_opt_set(&context, entry->key, entry->value, AV_OPT_SEARCH_CHILDREN);
        if (refused || (context.flags & ownedFlags) != flags)
            return std::string("option '") + entry->key + "=" + entry->value +
                   "' is what the encoder's own parameters decide";
        if (set == AVERROR_OPTION_NOT_FOUND) return unknown(context, entry->key);
        if (set < 0) return std::string("option '") + entry->key + "' can't be '" + entry->value + "'";
    }
    return "";
}

bool addParameters(AVCodecContext& context, const char* name, const std::string& parameters) {
    FreeDictionary all;
    return av_opt_get_dict_val(&context, name, AV_OPT_SEARCH_CHILDREN, &all.all) >= 0 &&
           av_dict_parse_string(&all.all, parameters.c_str(), "=", ":", 0) >= 0 &&
           av_opt_set_dict_val(&context, name, all.all, AV_OPT_SEARCH_CHILDREN) >= 0;
}

std::string checkOptions(const AVCodec& codec, const std::string& options) {
    const CodecPtr context(avcodec_alloc_context3(&codec));
    return context ? setOptions(*context, options) : "there is no memory";
}

}  // namespace av
