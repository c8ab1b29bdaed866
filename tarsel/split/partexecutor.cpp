#include "tarsel/split/partexecutor.h"

#include "tarsel/words/messages.h"

void PartExecutor::setFailure(PartState& state, const std::string& output, size_t part, int status,
                              int signal, const std::string& reported) {
    const std::string number = std::to_string(part + 1);
    state.status = signal > 0 ? static_cast<int>(Exit::failed) : status;
    if (signal > 0)
        state.failure = lineOf(Msg::splitPartKilled, {output, number, std::to_string(signal)});
    else if (reported.empty())
        state.failure = lineOf(Msg::splitPartFailed, {output, number, std::to_string(status)});
    else
        state.failure = reported;
}
