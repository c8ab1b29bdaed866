// Any bytes are read as subtitles or refused; what was read is found, and survives being saved and read.
#include <cstdio>
#include <string>

#include "core/caption/subtitle/qvsubtitles.h"
#include "tests/fuzz/fuzz.h"

namespace {

const QvFramerate rate(25.0);

// Text of several lines of which one is empty ends at that line when it is read again.
bool canBeReadAgain(const QvSubtitles& subtitles) {
    for (int i = 0; i < subtitles.nrSubtitles(); ++i) {
        const QvSubtitle& s = *subtitles.at(i);
        const std::string text = "|" + std::string(s.text.asString("")) + "|";
        if (text != "||" && text.find("||") != text.npos) return false;
        if (s.start.value() < 0 || s.end.value() < 0) return false;
        if (s.start.ms() >= 360000000 || s.end.ms() >= 360000000) return false;  // two digits of hours
        if (text.find('\r') != text.npos) return false;
    }
    return true;
}

void checkSaved(QvSubtitles& subtitles) {
    const MemoryFile file(".saved.srt");
    require(subtitles.saveToFile(file.name(), QvSubtitles::SRT) == 0);
    QvSubtitles again;
    require(again.parseFile(file.name(), rate) == 0);
    require(again.nrSubtitles() == subtitles.nrSubtitles());
    for (int i = 0; i < again.nrSubtitles(); ++i) {
        require(again.at(i)->text == subtitles.at(i)->text);
        require(again.at(i)->start.ms() == subtitles.at(i)->start.ms());
    }
}

// As the tool reads it: the same bytes give text, or a reason why not; nothing is lost in between.
void checkReading(const MemoryFile& file) {
    for (const int encoding : {0, 1, 1251}) {
        QvSubtitles subtitles;
        QvSubtitleFindings findings;
        const int status = subtitles.readFile(file.name(), rate, encoding, findings);
        require((status == 0) == (subtitles.nrSubtitles() > 0));
        require(status == 0 || findings.problem != QvSubtitleFindings::none);
        require(findings.lost >= 0);
        for (int i = 1; i < subtitles.nrSubtitles(); ++i)
            require(subtitles.at(i - 1)->start <= subtitles.at(i)->start);
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const bool quiet = std::freopen("/dev/null", "w", stdout) != nullptr;  // saving prints
    require(quiet);
    const MemoryFile file(data, size, ".srt");
    QvSubtitles subtitles;
    const int status = subtitles.parseFile(file.name(), rate);
    require(status == 0 || (status == -1 && subtitles.nrSubtitles() == 0));
    for (int i = 0; i < subtitles.nrSubtitles(); ++i) {
        const QvSubtitle& entry = *subtitles.at(i);
        QvSubtitle* found = subtitles.find(entry.start);
        require(!found || (found->start <= entry.start && found->end >= entry.start));
        require(entry.rows <= subtitles.maxRows());
    }
    if (status == 0 && canBeReadAgain(subtitles)) checkSaved(subtitles);
    subtitles.changeFramerate(QvFramerate(29.97));
    checkReading(file);
    return 0;
}
