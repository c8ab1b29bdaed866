#include "tarsel/split/childtask.h"

bool ChildTask::readProgress() {
    std::string text;
    const bool open = process_.read(text);
    progress_.add(text);
    return open;
}
