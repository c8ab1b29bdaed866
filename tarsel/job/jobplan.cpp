// What --dry-run prints.
#include <cstdio>
#include <string>

#include "tarsel/host/console.h"
#include "tarsel/job/job.h"
#include "tarsel/words/timespec.h"

namespace {

std::string formatOf(const JobStream& s) {
    if (s.type == 1)
        return std::to_string(s.width) + "x" + std::to_string(s.height) + " " + fourccText(s.fourcc) + " " +
               formatRate(s.rate);
    return std::to_string(s.samplerate) + " Hz, " + std::to_string(s.channels) + " ch, " +
           std::to_string(s.bits) + " bit";
}

}  // namespace

void Job::plan() {
    {
        const Signals::Watch storing(signals_, {.first = {}, .second = [&] { return files_->leave(); }});
        storeTask();
        if (taskFile_) taskFile_->commit();
    }
    printPlan();
}

void Job::printPlan() const {
    for (const auto& source : sources_)
        print("input   %s  %s\n", inQuotes(source->name()).c_str(), formatTime(source->duration()).c_str());
    long long total = 0;
    for (const JobStream& s : streams_) {
        print("stream  %s %d of %s, %s to %s\n", s.type == 1 ? "video" : "audio", s.decStream,
              inQuotes(s.source->name()).c_str(), formatTime(s.in.seconds()).c_str(),
              formatTime(s.out.seconds()).c_str());
        for (const auto& filter : s.chain) print("filter  %s\n", filter.c_str());
        print("encoder %s: %s\n", pipe_->encoder(s.type, s.encStream)->name(), formatOf(s).c_str());
        print("expect  %lld %s, %lld bytes\n", s.expected, s.type == 1 ? "frames" : "samples",
              s.bytes(s.expected));
        total += s.bytes(s.expected);
    }
    print("output  %s by %s, %s\n", outputs_ || stream_ ? inQuotes(options_.output).c_str() : "nothing",
          pipe_->getMuxer()->name(), formatBytes(total).c_str());
    showWarnings();
}
