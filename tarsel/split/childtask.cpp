#include "tarsel/split/childtask.h"

bool ChildTask::listen() {
    std::string text;
    const bool open = process_.read(text);
    talk_.hear(text);
    return open;
}
