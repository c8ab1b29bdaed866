// Any bytes are read as subtitles or refused; what was read is found, and survives being saved and read.
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <string>

#include <unistd.h>

#include "core/caption/qvsubtitles.h"

namespace {

void require(bool holds) {
    if (!holds) std::abort();
}

const QvFramerate rate(25.0);

std::string nameFor(const char* ext) { return "/tmp/srt-fuzz-" + std::to_string(getpid()) + ext; }

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
    const std::string name = nameFor(".saved.srt");
    require(subtitles.saveToFile(name.c_str(), QvSubtitles::SRT) == 0);
    QvSubtitles again;
    require(again.parseFile(name.c_str(), rate) == 0);
    require(again.nrSubtitles() == subtitles.nrSubtitles());
    for (int i = 0; i < again.nrSubtitles(); ++i) {
        require(again.at(i)->text == subtitles.at(i)->text);
        require(again.at(i)->start.ms() == subtitles.at(i)->start.ms());
    }
    std::remove(name.c_str());
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const bool quiet = std::freopen("/dev/null", "w", stdout) != nullptr;  // saving prints
    require(quiet);
    const std::string name = nameFor(".srt");
    std::ofstream(name, std::ios::binary)
        .write(reinterpret_cast<const char*>(data), static_cast<std::streamsize>(size));
    QvSubtitles subtitles;
    const int status = subtitles.parseFile(name.c_str(), rate);
    require(status == 0 || (status == -1 && subtitles.nrSubtitles() == 0));
    for (int i = 0; i < subtitles.nrSubtitles(); ++i) {
        const QvSubtitle& entry = *subtitles.at(i);
        QvSubtitle* found = subtitles.find(entry.start);
        require(!found || (found->start <= entry.start && found->end >= entry.start));
        require(entry.rows <= subtitles.maxRows());
    }
    if (status == 0 && canBeReadAgain(subtitles)) checkSaved(subtitles);
    subtitles.changeFramerate(QvFramerate(29.97));
    std::remove(name.c_str());
    return 0;
}
