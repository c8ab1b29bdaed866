#include "tarsel/job/inputlengths.h"

#include "tarsel/host/files.h"
#include "tarsel/words/messages.h"

InputLengths::Row InputLengths::rowOf(const std::string& name) {
    return {name, fileBytes(name), modifiedTime(name)};
}

InputLengths::InputLengths(std::span<const std::unique_ptr<Source>> sources,
                           std::span<const std::string> segments) {
    for (const auto& source : sources)
        if (source->isFile()) rows_.push_back(rowOf(source->name()));
    for (const std::string& segment : segments) rows_.push_back(rowOf(segment));
}

void InputLengths::check(bool again) const {
    for (const Row& row : rows_) {
        const long long now = fileBytes(row.name);
        if (now < 0 || now >= row.bytes) continue;
        const std::string left = std::to_string(now), all = std::to_string(row.bytes);
        const Failure shrank = failure(Msg::inputShrank, {row.name, left, all});
        if (!again) throw Failure(shrank);
        throw InputShrank(shrank, lineOf(Msg::inputShrankTaken, {row.name, left, all}));
    }
}

void InputLengths::checkUnchanged() const {
    for (const Row& row : rows_)
        if (fileBytes(row.name) != row.bytes || modifiedTime(row.name) != row.modified)
            throw failure(Msg::inputChanged, {row.name});
}
