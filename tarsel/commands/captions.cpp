// tarsel captions: what caption files hold, line by line.
#include <algorithm>
#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include "tarsel/captions/captiontext.h"
#include "tarsel/commands/captionexport.h"
#include "tarsel/commands/commands.h"
#include "tarsel/host/console.h"
#include "tarsel/host/files.h"
#include "tarsel/source/captionfile.h"
#include "tarsel/source/source.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/messages.h"

namespace {

std::string bytesText(std::span<const QvCcBytePair> pairs) {
    std::string text;
    for (const auto& pair : pairs) {
        char word[8];
        std::snprintf(word, sizeof word, text.empty() ? "%02x%02x" : " %02x%02x", pair.byte1, pair.byte2);
        text += word;
    }
    return text;
}

void printLine(std::span<const QvCcBytePair> pairs, const QvFramerate& rate) {
    const int field = pairs.front().type() + 1;
    const std::string time = timecodeText(pairs.front().time, rate), bytes = bytesText(pairs),
                      text = qvCcText(pairs, pairs.front().type());
    print("%s\t%d\t%s\t%s\n", time.c_str(), field, bytes.c_str(), text.c_str());
}

// A line for each field and time.
void printLines(const QvCcData& data, const QvFramerate& rate) {
    const auto pairs = data.pairs();
    for (auto begin = pairs.begin(); begin != pairs.end();) {
        const auto end = std::find_if(begin, pairs.end(), [&](const auto& p) {
            return p.type() != begin->type() || !(p.time == begin->time);
        });
        printLine({begin, end}, rate);
        begin = end;
    }
}

std::unique_ptr<QvDecodePipe> openFiles(const std::vector<std::string>& files) {
    auto decoder = makeCodec<QvDecodePipe>("sccdec", 2);
    decoder->setParam("dropFrameLines", 1);
    AnyVector names;
    for (const auto& file : files) {
        requireInput(file);
        names.append(Any(file.c_str()));
    }
    decoder->setParam("filenames", names);
    if (decoder->open() == QvStatus::ok) return decoder;
    refuseScc(files.front());
}

void showCaptions(const std::vector<std::string>& files, const std::optional<QvFramerate>& asked) {
    QvFramerate rate = openFiles(files)->QvCodec::getParam("framerate").asFramerate();
    const bool dropFrame = rate.df();
    QvCcData all;
    for (size_t field = 0; field < files.size(); ++field) {
        QvCcData one;
        if (asked)
            rate = readScc(files[field], static_cast<int>(field), asked, one);
        else if (one.readScc(Any(files[field].c_str()), static_cast<int>(field), false, rate, &dropFrame,
                             true) != 0)
            throw failure(Msg::readFailed, {files[field]});
        all.extend(one);
    }
    printWarnings();
    all.sort();
    printLines(all, rate);
}

}  // namespace

void addCaptions(CommandLine& line, Signals& signals) {
    Command command = line.command(
        "captions",
        "Show the captions of an SCC file: time, field, bytes, text; or write them in another form");
    auto given = std::make_shared<CaptionExport>();
    command.arguments("FILE", given->files,
                      "SCC file of field 1, and one of field 2; or a subtitle file or a film", 2);
    command.flag("--srt", given->srt, "As SubRip, with the times at which captions are on the screen");
    command.flag("--vtt", given->vtt, "As WebVTT");
    command.flag("--scc", given->scc, "As SCC, captions that pop on");
    command.flag("--json", given->json, "As JSON, one object a caption");
    command.option("--stream", given->stream, "Which subtitles of a film; without it the first",
                   "N|LANGUAGE");
    command.option("--rate", given->rate, "Frame rate of the timecodes; 29.97df for drop frame", "R");
    command.option("-o,--output", given->output,
                   "What to write, in place of the standard output; its extension may say the form", "FILE");
    given->outputs.add(command);
    command.action([&signals, given] {
        const std::string form = given->chosen();
        form.empty() ? showCaptions(given->files, given->askedRate()) : given->run(form, signals);
    });
}
