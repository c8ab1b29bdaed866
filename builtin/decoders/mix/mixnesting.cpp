#include "builtin/decoders/mix/mixnesting.h"

#include <utility>
#include <vector>

#include "core/engine/files/qvfileutil.h"

namespace {

struct Opening {
    std::vector<Any> files;
    int inputs = 0;
    std::string failure;
};

Opening& opening() {
    thread_local Opening current;
    return current;
}

}  // namespace

MixNesting::MixNesting(const Any& file) {
    Opening& now = opening();
    if (now.files.empty()) now = Opening();
    for (const Any& outer : now.files)
        if (fault_.empty() && outer.isValid() && file.isValid() && QvFile::isSameFile(outer, file))
            fault_ = "it is an input of itself";
    if (fault_.empty() && now.files.size() >= maxDepth)
        fault_ = "more than " + std::to_string(maxDepth) + " metafiles inside one another";
    now.files.push_back(file);
}

MixNesting::~MixNesting() { opening().files.pop_back(); }

bool MixNesting::addInput() { return ++opening().inputs <= maxInputs; }

void MixNesting::noteFailure(const std::string& text) { opening().failure = text; }

std::string MixNesting::takeFailure() { return std::exchange(opening().failure, {}); }
