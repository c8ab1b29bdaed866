#include "plugins/av/mux/muxoptions.h"

#include <algorithm>
#include <cstring>
#include <numeric>
#include <vector>

#include "plugins/av/source/avheaders.h"

namespace av {

namespace {

// Letters to change, add or leave out.
std::size_t distance(const std::string& a, const std::string& b) {
    std::vector<std::size_t> row(b.size() + 1);
    std::iota(row.begin(), row.end(), std::size_t{0});
    for (std::size_t i = 0; i < a.size(); ++i) {
        std::size_t before = row[0];
        row[0] = i + 1;
        for (std::size_t j = 0; j < b.size(); ++j) {
            const std::size_t changed = before + (a[i] != b[j]);
            before = row[j + 1];
            row[j + 1] = std::min({changed, row[j] + 1, row[j + 1] + 1});
        }
    }
    return row.back();
}

// Options for writing, of the container and of all containers.
std::vector<std::string> names(const AVOutputFormat& format) {
    std::vector<std::string> all;
    const AVClass* const general = avformat_get_class();
    for (const AVClass* const kind : {format.priv_class, general}) {
        if (!kind) continue;
        const AVOption* option = nullptr;
        while ((option = av_opt_next(&kind, option)))
            if (option->type != AV_OPT_TYPE_CONST && (option->flags & AV_OPT_FLAG_ENCODING_PARAM))
                all.push_back(option->name);
    }
    return all;
}

std::string unknown(const std::string& name, const std::vector<std::string>& all, const char* format) {
    std::vector<std::string> near;
    for (const std::string& other : all)
        if (distance(name, other) <= std::max<std::size_t>(name.size() / 3, 1)) near.push_back(other);
    std::string text = "'" + name + "' is no option of " + format;
    for (std::size_t i = 0; i < near.size() && i < 3; ++i) text += (i == 0 ? "; similar: " : ", ") + near[i];
    return text;
}

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

std::string parseMuxOptions(const std::string& text, const char* format, AVDictionary** options) {
    const AVOutputFormat* const kind = av_guess_format(format, nullptr, nullptr);
    if (!kind) return std::string("the libraries have no container ") + format;
    AVDictionary* read = nullptr;
    std::string problem;
    if (av_dict_parse_string(&read, text.c_str(), "=", ":", 0) < 0)
        problem = "'" + text + "' is no list of name=value, separated by ':'";
    const std::vector<std::string> all = names(*kind);
    const AVDictionaryEntry* entry = nullptr;
    while (problem.empty() && (entry = av_dict_get(read, "", entry, AV_DICT_IGNORE_SUFFIX))) {
        if (std::find(all.begin(), all.end(), entry->key) == all.end()) {
            problem = unknown(entry->key, all, format);
            continue;
        }
        if (reorders(entry->key, entry->value)) {
            problem = std::string("the place of the index is the parameter 'fastStart', not '") + entry->key +
                      "=" + entry->value + "'";
            continue;
        }
        AVFormatContext* trial = nullptr;
        if (avformat_alloc_output_context2(&trial, kind, nullptr, nullptr) >= 0 &&
            av_opt_set(trial, entry->key, entry->value, AV_OPT_SEARCH_CHILDREN) < 0)
            problem = std::string("'") + entry->value + "' is no value of the option " + entry->key;
        avformat_free_context(trial);
    }
    if (problem.empty() && options) av_dict_copy(options, read, 0);
    av_dict_free(&read);
    return problem;
}

}  // namespace av
