#include "tarsel/job/plan/filmtags.h"

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <optional>

#include "tarsel/job/plan/timecodes.h"
#include "tarsel/source/wavwords.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/xmlnames.h"

namespace {

constexpr size_t kLongestKey = 40;  // of a dictionary

std::string textOf(const Any& value) {
    const Any text = value.toString();
    return text.isString() ? text.asString() : "";
}

struct Chapter {
    MediaTime time;
    std::string title;
};

std::vector<Chapter> chaptersOf(const AnyDict& meta) {
    std::vector<Chapter> chapters;
    const AnyVector all = meta.getVector("chapters", AnyVector());
    for (const Any& entry : all)
        if (entry.isDict() && entry.asDict().get("time").isMediaTime())
            chapters.push_back(
                {entry.asDict().get("time").asMediaTime(), textOf(entry.asDict().get("title"))});
    std::stable_sort(chapters.begin(), chapters.end(),
                     [](const Chapter& a, const Chapter& b) { return a.time < b.time; });
    return chapters;
}

// One of the segments that follow each other.
class Part {
  public:
    explicit Part(const JobPlan& plan)
        : stream_(plan.streams.front()), input_(plan.input(stream_)), meta_(input_.meta) {}

    const AnyDict& meta() const { return meta_; }
    MediaTime length() const {
        const QvRatio rate =
            stream_.isVideo() ? stream_.picture.rate.rate() : QvRatio(stream_.sound.samplerate, 1);
        return qvInstantOf(stream_.expected, rate);
    }

    // Times count from the start of the part. With `always` there is a chapter at the start.
    std::vector<Chapter> chapters(bool always) const {
        std::vector<Chapter> taken;
        std::optional<Chapter> first;
        for (const Chapter& chapter : chaptersOf(meta_)) {
            if (chapter.time <= in())
                first = Chapter{MediaTime(), chapter.title};
            else if (chapter.time - in() < length())
                taken.push_back({chapter.time - in(), chapter.title});
        }
        if (!first && always) first = Chapter{MediaTime(), name()};
        if (first) taken.insert(taken.begin(), *first);
        return taken;
    }

    // Of the first picture; empty for none.
    std::string timecode() const {
        std::string text = textOf(meta_.get("timecode"));
        if (text.empty()) text = textOf(meta_.get("startTimecode"));
        if (text.empty() || !stream_.isVideo() || input_.video.empty()) return text;
        return movedTimecode(text, input_.video.front().picture.rate, stream_.picture.rate,
                             [this](const QvFramerate& from) { return in().position(from); });
    }

  private:
    MediaTime in() const { return stream_.part.whole ? MediaTime() : stream_.part.in; }

    std::string name() const {
        const std::string title = textOf(meta_.get("title"));
        return title.empty() ? std::filesystem::path(input_.name).stem().string() : title;
    }

    const PlannedStream& stream_;
    const JobInput& input_;
    const AnyDict& meta_;
};

AnyVector joinedChapters(const std::vector<Part>& parts) {
    const bool any = std::any_of(parts.begin(), parts.end(),
                                 [](const Part& part) { return !chaptersOf(part.meta()).empty(); });
    AnyVector all;
    if (!any) return all;
    MediaTime before;
    std::string last;
    for (const Part& part : parts) {
        for (const Chapter& chapter : part.chapters(parts.size() > 1)) {
            // A cut may take two parts out of one chapter.
            const bool same = chapter.time == MediaTime() && !all.empty() && chapter.title == last;
            last = chapter.title;
            if (same) continue;
            AnyDict entry("time", Any(before + chapter.time));
            if (!chapter.title.empty()) entry.set("title", chapter.title.c_str());
            all.append(Any(entry));
        }
        before = before + part.length();
    }
    return all;
}

bool isTimecode(const std::string& text) {
    const std::string form = "00:00:00:00";
    if (text.size() != form.size()) return false;
    for (size_t i = 0; i < form.size(); ++i) {
        const bool digit = std::isdigit(static_cast<unsigned char>(text[i])) != 0;
        if (form[i] == '0' ? !digit : text[i] != ':' && !(i == 8 && text[i] == ';')) return false;
    }
    return text.substr(0, 2) < "24" && text[3] < '6' && text[6] < '6';
}

bool isKey(const std::string& key) {
    const auto fits = [](unsigned char c) { return std::isalnum(c) || c == '_' || c == '-'; };
    return !key.empty() && key.size() <= kLongestKey && std::isalpha(static_cast<unsigned char>(key[0])) &&
           std::all_of(key.begin(), key.end(), fits);
}

// "key=value"; an empty value removes the tag.
void setTag(AnyDict& tags, const std::string& word) {
    const size_t equals = word.find('=');
    if (equals == std::string::npos) throw failure(Msg::keyNotPair, {"--meta", word});
    const std::string key = word.substr(0, equals), value = word.substr(equals + 1);
    if (key == "language") throw failure(Msg::metaLanguage, {"--meta"});
    if (!isKey(key)) throw failure(Msg::metaKeyWrong, {"--meta", key});
    if (!xmlKeeps(value)) throw failure(Msg::metaValueWrong, {"--meta", key});
    if (key == "timecode" || key == "startTimecode") {
        if (!value.empty() && !isTimecode(value)) throw failure(Msg::metaTimecodeWrong, {"--meta", value});
        tags.remove("startTimecode");
    }
    if (key == "chapters" && !value.empty()) throw failure(Msg::metaKeyWrong, {"--meta", key});
    if (value.empty())
        tags.remove(key.c_str());
    else
        tags.set(key == "startTimecode" ? "timecode" : key.c_str(), value.c_str());
}

bool isLanguage(const std::string& code) {
    return code.size() == 3 &&
           std::all_of(code.begin(), code.end(), [](unsigned char c) { return std::islower(c); });
}

std::vector<std::string> split(const std::string& text) {
    std::vector<std::string> words(1);
    for (const char c : text) {
        if (c == ',')
            words.emplace_back();
        else
            words.back() += c;
    }
    return words;
}

}  // namespace

AnyDict filmTags(const std::vector<const JobPlan*>& plans, const TagOptions& options) {
    AnyDict tags;
    if (!options.none) {
        std::vector<Part> parts;
        for (const JobPlan* plan : plans) parts.emplace_back(*plan);
        for (const auto [key, value] : parts.front().meta()) {
            const std::string text = value->isText() ? textOf(*value) : "";
            const bool alike = std::all_of(parts.begin(), parts.end(), [name = key, &text](const Part& part) {
                return textOf(part.meta().get(name)) == text;
            });
            if (!text.empty() && alike && xmlKeeps(text) && isKey(key)) tags.set(key, text.c_str());
        }
        tags.remove("startTimecode");
        tags.remove("timecode");
        if (const std::string timecode = parts.front().timecode(); !timecode.empty())
            tags.set("timecode", timecode.c_str());
        if (const AnyVector chapters = joinedChapters(parts); !chapters.empty())
            tags.set("chapters", Any(chapters));
    }
    for (const std::string& word : options.given) setTag(tags, word);
    return tags;
}

void planLanguages(std::vector<PlannedStream>& streams, const TagOptions& options) {
    std::vector<PlannedStream*> sounds;
    for (PlannedStream& stream : streams) {
        if (options.none) stream.language = stream.title = "";
        if (!stream.isVideo()) sounds.push_back(&stream);
    }
    if (options.languages.empty()) return;
    const std::vector<std::string> codes = split(options.languages);
    if (codes.size() > sounds.size())
        throw failure(Msg::languageNoSound, {"--language", std::to_string(sounds.size())});
    for (size_t i = 0; i < codes.size(); ++i) {
        if (!codes[i].empty() && !isLanguage(codes[i]))
            throw failure(Msg::languageWrong, {"--language", codes[i]});
        sounds[i]->language = codes[i];
    }
}

void checkTags(const OutputForm& output, const TagOptions& options) {
    const std::string option = !options.given.empty()       ? "--meta"
                               : !options.languages.empty() ? "--language"
                                                            : "";
    if (output.kind == OutputKind::wav && !output.isStream() && options.languages.empty()) {
        for (const std::string& word : options.given)
            if (const std::string key = word.substr(0, word.find('=')); isKey(key) && !isWavWord(key))
                throw failure(Msg::metaNoRoom, {"--meta " + key, output.name});
        return;
    }
    if (!option.empty() && output.kind != OutputKind::module && output.kind != OutputKind::nothing)
        throw failure(Msg::metaNoRoom, {option, output.name});
}

std::string tagsText(const AnyDict& tags) {
    std::vector<std::string> parts;
    for (const auto [key, value] : tags) {
        if (value->isVector())
            parts.push_back(std::to_string(value->asVector().size()) + " chapters");
        else
            parts.push_back(std::string(key) + " " + inQuotes(textOf(*value)));
    }
    return joined(parts);
}
