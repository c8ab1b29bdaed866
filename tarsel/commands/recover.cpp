// tarsel recover: puts in order what ended runs have left in folders.
#include <algorithm>
#include <cstdio>
#include <memory>

#include "tarsel/commands/commands.h"
#include "tarsel/host/files.h"
#include "tarsel/host/outputs/recovery.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/messages.h"

namespace {

void recover(const std::vector<std::string>& places) {
    for (const auto& place : places)
        if (const std::string why = whyNoFolder(place); !why.empty())
            throw failure(Msg::recoverNoFolder, {place, why});
    std::string unfinished;
    size_t stayed = 0;
    for (const auto& place : places) {
        const auto found = recoverPlace(place, {.all = true});
        for (const auto& line : recoveryLines(place, found, false))
            std::fprintf(stderr, "tarsel: %s\n", line.c_str());
        const auto remaining = std::count_if(found.begin(), found.end(), [](const Leftover& one) {
            return one.remains() && one.outcome != Leftover::Outcome::inUse;
        });
        stayed += static_cast<size_t>(remaining);
        if (remaining > 0 && unfinished.empty()) unfinished = place;
    }
    if (stayed > 0)
        throw failure(Msg::recoverUnfinished,
                      {unfinished, std::to_string(stayed) + (stayed == 1 ? " folder" : " folders")});
}

}  // namespace

void addRecover(CommandLine& line) {
    Command command = line.command("recover", "Finish or take back what ended runs have left in FOLDERs");
    auto places = std::make_shared<std::vector<std::string>>();
    command.arguments("FOLDER", *places, "Folders that outputs are in");
    command.action([places] { recover(*places); });
}
