#include "tarsel/commands/captionexport.h"

#include <algorithm>
#include <cstdio>
#include <memory>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/captions/captiontext.h"
#include "tarsel/host/console.h"
#include "tarsel/host/files.h"
#include "tarsel/host/outputs/outputs.h"
#include "tarsel/host/outputs/streamoutput.h"
#include "tarsel/source/captionfile.h"
#include "tarsel/source/source.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

struct Captions {
    std::vector<QvCcCue> cues[2];  // of each field
    QvFramerate rate;
};

QvFramerate dropFrame() {
    QvFramerate rate = QvFramerate::f29p();
    rate.setDf(true);
    return rate;
}

// Without "<i>" and its like.
std::string withoutTags(const std::string& markup) {
    std::string text;
    for (size_t at = 0; at < markup.size(); ++at) {
        const size_t close = markup[at] == '<' ? markup.find('>', at) : std::string::npos;
        if (close == std::string::npos)
            text += markup[at];
        else
            at = close;
    }
    return text;
}

QvCcCue cueOf(const QvSubtitle& subtitle) {
    QvCcCue cue{subtitle.start, subtitle.end, {}, false};
    const std::string text = subtitle.text.asString("");
    for (size_t at = 0; at <= text.size();) {
        const size_t end = std::min(text.find('|', at), text.size());
        const std::string row = text.substr(at, end - at);
        cue.rows.push_back({15, 0, withoutTags(row), row});
        at = end + 1;
    }
    return cue;
}

void readSubtitles(const std::string& file, const std::string& choice, Captions& captions) {
    requireInput(file);
    const int stream = subtitleStream(file, choice);
    QvSubtitles read;
    QvSubtitleFindings found;
    if (read.readFile(Any(file.c_str()), QvFramerate(QvRatio(25, 1)), 0, found, stream) != QvStatus::ok ||
        found.problem != QvSubtitleFindings::none)
        throw failure(Msg::inputNoSubtitles, {file});
    if (found.lost > 0)
        std::fprintf(stderr, "tarsel: warning: %s\n",
                     lineOf(Msg::captionsLost, {file, std::to_string(found.lost)}).c_str());
    for (int i = 0; i < read.nrSubtitles(); ++i) captions.cues[0].push_back(cueOf(*read.at(i)));
}

void readFields(const std::vector<std::string>& files, const std::optional<QvFramerate>& asked,
                Captions& captions) {
    for (size_t field = 0; field < files.size(); ++field) {
        requireInput(files[field]);
        QvCcData data;
        const QvFramerate found = readScc(files[field], static_cast<int>(field), asked, data);
        if (field == 0 || captions.rate.rate() < found.rate()) captions.rate = found;
        captions.cues[field] = qvCcCues(data.pairs(), static_cast<int>(field));
    }
    printWarnings();
    if (captions.cues[0].empty() && captions.cues[1].empty())
        throw failure(Msg::inputNoCaptions, {files.front()});
}

std::string jsonText(const Captions& captions) {
    struct Line {
        const QvCcCue* cue;
        int field;
    };
    std::vector<Line> lines;
    for (const int field : {0, 1})
        for (const QvCcCue& cue : captions.cues[field]) lines.push_back({&cue, field + 1});
    std::stable_sort(lines.begin(), lines.end(),
                     [](const Line& a, const Line& b) { return a.cue->start < b.cue->start; });
    std::string text;
    for (const Line& line : lines) text += captionJson(*line.cue, captions.rate, line.field) + "\n";
    return text;
}

std::string sccText(const Captions& captions) {
    QvCcLosses losses;
    const QvCcData data = qvCcEncode(captions.cues[0], losses);
    const auto warn = [](const std::string& line) {
        std::fprintf(stderr, "tarsel: warning: %s\n", line.c_str());
    };
    if (!losses.characters.empty()) warn(lineOf(Msg::captionsLetters, {losses.characters}));
    if (losses.cut > 0) warn(lineOf(Msg::captionsCut, {std::to_string(losses.cut)}));
    if (losses.late > 0)
        warn(lineOf(Msg::captionsLate, {std::to_string(losses.late), formatTime(losses.latest)}));
    return data.sccText(captions.rate, {.dropFrameLines = true, .complete = true});
}

void save(const std::string& text, Outputs& outputs, const std::string& extension, Signals& signals) {
    const Signals::Watch watch(signals, {.first = {}, .second = [&] { return outputs.leave(); }});
    const std::string name = outputs.begin(extension);
    if (const int error = writeFile(name, text))
        throw systemFailure(Msg::outputSystem, outputs.output().string(), error);
    outputs.commit();
    signals.complete();
}

}  // namespace

// The one form that was asked for, or that the name of the output says.
std::string CaptionExport::chosen() const {
    const std::pair<bool, const char*> forms[] = {{srt, "srt"}, {vtt, "vtt"}, {scc, "scc"}, {json, "json"}};
    std::string form;
    for (const auto& [asked, name] : forms) {
        if (!asked) continue;
        if (!form.empty()) throw failure(Msg::captionsForms, {"--" + form, std::string("--") + name});
        form = name;
    }
    const bool named = !output.empty() && output != "-";
    const std::string extension = QvFile::getExt(Any(output.c_str()), true).asString("");
    if (form.empty() && named)
        for (const auto& [asked, name] : forms)
            if (extension == name) form = name;
    if (form.empty() && named) throw failure(Msg::captionsNoForm, {output});
    if (form.empty() && isOneFile()) throw failure(Msg::captionsNotListed, {files.front()});
    if (form.empty()) return form;
    if (!stream.empty() && !isOneFile()) throw failure(Msg::captionsNoStream, {"--stream", files.front()});
    if (files.size() > 1 && form != "json") throw failure(Msg::captionsOneFile, {"--" + form, files[1]});
    return form;
}

bool CaptionExport::isOneFile() const { return isSubtitleFile(files.front()) || isFilm(files.front()); }

std::optional<QvFramerate> CaptionExport::askedRate() const {
    return rate.empty() ? std::nullopt : std::optional(parseTimecodeRate(rate, "--rate"));
}

std::string CaptionExport::text(const std::string& form) const {
    Captions captions;
    const auto asked = askedRate();
    captions.rate = asked.value_or(dropFrame());
    if (isOneFile())
        readSubtitles(files.front(), stream, captions);
    else
        readFields(files, asked, captions);
    return form == "srt"   ? srtText(captions.cues[0])
           : form == "vtt" ? vttText(captions.cues[0])
           : form == "scc" ? sccText(captions)
                           : jsonText(captions);
}

void CaptionExport::run(const std::string& form, Signals& signals) const {
    if (output.empty() || output == "-") return printText(text(form));
    if (const auto stream = StreamOutput::find(output, files)) {
        if (const int error = stream->write(text(form)))
            throw systemFailure(Msg::outputSystem, output, error);
    } else {
        Outputs file(output, "-o", files, outputs.policy());
        save(text(form), file, form, signals);
    }
    std::fprintf(stderr, "tarsel: wrote %s\n", inQuotes(output).c_str());
}
