#include "tarsel/batch/snapshot.h"

#include <climits>

#include "tarsel/host/childprocess.h"
#include "tarsel/host/files.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

constexpr const char* kOption = "--snapshot";
constexpr long long kMostBytes = 1LL << 30;  // of the tasks of an element

std::string cutAt(std::string& text, char mark) {
    const std::string part = text.substr(0, text.find(mark));
    text.erase(0, std::min(text.size(), part.size() + 1));
    return part;
}

}  // namespace

std::string Snapshot::add(const QvBatchList& list, size_t task, const std::vector<size_t>& makers) {
    std::vector<size_t> indexes = {task};
    indexes.insert(indexes.end(), makers.begin(), makers.end());
    const std::string document = contentsOf(BatchFile::handOver(list, indexes));
    std::string word = std::to_string(text_.size()) + ":" + std::to_string(document.size());
    for (const size_t index : indexes) word += (index == task ? ":" : ",") + std::to_string(index + 1);
    text_ += document;
    return word;
}

void Snapshot::write(const std::string& file) const {
    if (const int error = writeFile(file, text_); error != 0)
        throw systemFailure(Msg::outputSystem, file, error);
}

SnapshotTasks readSnapshot(const BatchFile& list, const std::string& file, const std::string& word) {
    std::string rest = word;
    const long long from = parseNumber(cutAt(rest, ':'), 0, LLONG_MAX, kOption);
    const long long length = parseNumber(cutAt(rest, ':'), 1, kMostBytes, kOption);
    std::vector<int> numbers;
    do numbers.push_back(static_cast<int>(parseNumber(cutAt(rest, ','), 1, INT_MAX, kOption)));
    while (!rest.empty());
    const Descriptor document = fileInMemory(bytesAt(file, from, static_cast<size_t>(length)));
    std::vector<BatchTask> tasks = list.handedTasks(document.get(), numbers);
    SnapshotTasks found{std::move(tasks.front()), {}};
    tasks.erase(tasks.begin());
    found.makers = std::move(tasks);
    return found;
}
