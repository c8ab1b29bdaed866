#include "tarsel/captions/captiontext.h"

#include <cmath>
#include <cstdio>

#include "tarsel/words/json.h"

namespace {

constexpr int kLowestRow = 15;
constexpr int kBottomRow = 12;  // from here on a caption stands at the bottom

// "00:00:01,500"
std::string clockText(const MediaTime& time, char point) {
    const long long ms = std::llround(time.seconds() * 1000);
    char text[40];
    std::snprintf(text, sizeof text, "%02lld:%02lld:%02lld%c%03lld", ms / 3600000, ms / 60000 % 60,
                  ms / 1000 % 60, point, ms % 1000);
    return text;
}

// "<i>" and "</i>" stay, the rest must not be taken for a tag.
std::string escaped(const std::string& markup) {
    std::string text;
    for (size_t at = 0; at < markup.size();) {
        const std::string_view rest = std::string_view(markup).substr(at);
        const std::string_view tag = rest.starts_with("<i>") ? "<i>" : rest.starts_with("</i>") ? "</i>" : "";
        if (!tag.empty()) {
            text += tag;
            at += tag.size();
            continue;
        }
        const char c = markup[at++];
        text += c == '&' ? "&amp;" : c == '<' ? "&lt;" : c == '>' ? "&gt;" : std::string(1, c);
    }
    return text;
}

// Percent of the height: the rows fill the middle 80.
std::string placeText(const QvCcCue& cue) {
    if (cue.rows.empty() || cue.rows.back().row >= kBottomRow) return "";
    return " line:" + std::to_string(10 + (cue.rows.front().row - 1) * 80 / kLowestRow) + "%";
}

}  // namespace

std::string timecodeText(const MediaTime& time, const QvFramerate& rate) {
    char text[QvTimecode::textSize];
    time.timecode(rate).pprint(text, false);
    std::string shown = text;
    if (rate.df()) shown[shown.rfind(':')] = ';';
    return shown;
}

std::string srtText(const std::vector<QvCcCue>& cues) {
    std::string text;
    int number = 0;
    for (const QvCcCue& cue : cues)
        text += std::to_string(++number) + "\n" + clockText(cue.start, ',') + " --> " +
                clockText(cue.end, ',') + "\n" + cue.markup() + "\n\n";
    return text;
}

std::string vttText(const std::vector<QvCcCue>& cues) {
    std::string text = "WEBVTT\n\n";
    for (const QvCcCue& cue : cues)
        text += clockText(cue.start, '.') + " --> " + clockText(cue.end, '.') + placeText(cue) + "\n" +
                escaped(cue.markup()) + "\n\n";
    return text;
}

std::string captionJson(const QvCcCue& cue, const QvFramerate& rate, int field) {
    Json line = {{"start", cue.start.seconds()},
                 {"end", cue.end.seconds()},
                 {"timecode", timecodeText(cue.start, rate)},
                 {"end_timecode", timecodeText(cue.end, rate)},
                 {"field", field},
                 {"text", cue.text()}};
    if (!cue.rows.empty()) {
        line["row"] = cue.rows.front().row;
        line["column"] = cue.rows.front().column;
    }
    if (cue.open) line["open"] = true;
    return line.dump(-1, ' ', false, Json::error_handler_t::replace);
}
