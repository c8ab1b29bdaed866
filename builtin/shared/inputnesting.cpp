#include "builtin/shared/inputnesting.h"

#include <utility>

#include "core/decode/qvdecoder.h"
#include "core/decode/qvfileopencb.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/status.h"

namespace {

// Keeps what the factory said last of a file that it could not open, and after it what the decoder said.
struct Reason : QvFileOpenCb {
    std::string text;
    int fileOpenFinished(int result, QvFileOpenCbData& data) override {
        if (result == QvStatus::ok) return QvStatus::ok;
        text = data.text.toString().asString("");
        if (data.reason.isText()) text += std::string(" ") + data.reason.toString().asString("");
        return QvStatus::ok;
    }
};

}  // namespace

// A pointer: an object with a constructor would be made at its first use, with memory that may be short.
thread_local InputNesting::Opening* InputNesting::opening_ = nullptr;

InputNesting::InputNesting(const Any& file) {
    if (!opening_) own_ = std::make_unique<Opening>();
    Opening& now = own_ ? *own_ : *opening_;
    for (const Any& outer : now.files)
        if (fault_.empty() && outer.isValid() && file.isValid() && QvFile::isSameFile(outer, file))
            fault_ = "it is an input of itself";
    if (fault_.empty() && now.files.size() >= maxDepth)
        fault_ = "more than " + std::to_string(maxDepth) + " metafiles inside one another";
    now.files.push_back(file);
    opening_ = &now;
}

InputNesting::~InputNesting() {
    opening_->files.pop_back();
    if (own_) opening_ = nullptr;
}

void InputNesting::noteFailure(const std::string& text) {
    if (opening_ && opening_->failure.empty()) opening_->failure = text;
}

std::unique_ptr<QvDecodePipe> InputNesting::open(const Any& file, const Make& make, std::string& reason) {
    if (opening_) opening_->failure.clear();
    if (opening_ && ++opening_->inputs > maxInputs) {
        reason = "more than " + std::to_string(maxInputs) + " inputs";
        return nullptr;
    }
    if (file.isText() && QvFile::isFile(file) && QvFile::flength(file) < 0) {
        reason = "it can't be read, or is no regular file";
        return nullptr;
    }
    Reason callback;
    std::unique_ptr<QvDecodePipe> decoder(make(&callback));
    const std::string inner = opening_ ? std::exchange(opening_->failure, {}) : "";
    if (!decoder) {
        reason = inner.empty() ? callback.text : inner;
        return nullptr;
    }
    // A mix whose inputs fail counts as open.
    reason = decoder->QvCodec::getParam("inputFailure").toString().asString("");
    return reason.empty() ? std::move(decoder) : nullptr;
}
