#include "builtin/decoders/mix/mixnesting.h"

#include <utility>

#include "core/engine/files/qvfileutil.h"

thread_local MixNesting* MixNesting::innermost_ = nullptr;

MixNesting::MixNesting(const Any& file) : file_(file) {
    int depth = 0;
    for (const MixNesting* mix = outer_; mix; mix = mix->outer_, ++depth)
        if (fault_.empty() && mix->file_.isValid() && file.isValid() && QvFile::isSameFile(mix->file_, file))
            fault_ = "it is an input of itself";
    if (fault_.empty() && depth >= maxDepth)
        fault_ = "more than " + std::to_string(maxDepth) + " metafiles inside one another";
    innermost_ = this;
}

MixNesting::~MixNesting() { innermost_ = outer_; }

bool MixNesting::addInput() {
    MixNesting* outermost = innermost_;
    while (outermost && outermost->outer_) outermost = outermost->outer_;
    return !outermost || ++outermost->inputs_ <= maxInputs;
}

void MixNesting::failed(const std::string& text) const {
    if (outer_) outer_->innerFailure_ = text;
}

std::string MixNesting::takeFailure() {
    return innermost_ ? std::exchange(innermost_->innerFailure_, {}) : std::string();
}
