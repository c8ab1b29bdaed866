#include "plugins/av/mux/muxoptions.h"

#include <algorithm>
#include <memory>
#include <vector>

namespace av {

namespace {

// Writes the film a second time in another order, which takes files of the library's own.
bool reorders(const std::string& name, const std::string& value) {
    return name == "moov_size" || name == "cues_to_front" ||
           (name == "movflags" && value.find("faststart") != value.npos);
}

}  // namespace

bool makesFragments(const std::string& options) {
    for (const char* word : {"frag", "empty_moov", "dash", "cmaf", "isml"})
        if (options.find(word) != options.npos) return true;
    return false;
}

std::string parseMuxOptions(const std::string& text, const char* format, OptionList& options) {
    const AVOutputFormat* const kind = av_guess_format(format, nullptr, nullptr);
    if (!kind) return std::string("the libraries have no container ") + format;
    if (!options.parse(text)) return "'" + text + "' is no list of name=value, separated by ':'";
    const std::vector<std::string> all = writingOptions({kind->priv_class, avformat_get_class()});
    const AVDictionaryEntry* entry = nullptr;
    while ((entry = options.next(entry))) {
        const std::string name = entry->key, value = entry->value;
        if (std::find(all.begin(), all.end(), name) == all.end()) {
            std::string text = "'";
            text.append(name).append("' is no option of ").append(format);
            if (const std::string near = similarNames(name, all); !near.empty())
                text.append("; similar: ").append(near);
            return text;
        }
        if (reorders(name, value)) {
            std::string text = "the place of the index is the parameter 'fastStart', not '";
            text.append(name).append("=").append(value).append("'");
            return text;
        }
        AVFormatContext* made = nullptr;
        checked(avformat_alloc_output_context2(&made, kind, nullptr, nullptr));
        const std::unique_ptr<AVFormatContext, void (*)(AVFormatContext*)> trial(made, avformat_free_context);
        if (trial && checked(av_opt_set(trial.get(), entry->key, entry->value, AV_OPT_SEARCH_CHILDREN)) < 0)
            return std::string("'").append(value).append("' is no value of the option ").append(name);
    }
    return "";
}

}  // namespace av
