// A file of settings that several runs of the tool change.
#pragma once

#include <functional>
#include <string>

#include "tarsel/host/descriptor.h"
#include "tarsel/words/messages.h"

class SharedFile {
  public:
    // Waits until no other run changes the file, whose folder is made if it is missing, and keeps others from
    // it as long as this lives. The lock is the file NAME.lock, which stays. Throws Failure (output) with the
    // message `refused`, that of a file and the system's reason.
    explicit SharedFile(const std::string& name, Msg refused = Msg::presetsNotWritten);

    // Puts a new file in the place of the old one: `write` makes it under the name that it is given, and it
    // is brought to the disk before it gets its own. A symbolic link stays, and what it leads to is replaced.
    // Throws Failure (output); the old file is unchanged then.
    void replace(const std::function<void(const std::string& name)>& write);

  private:
    std::string name_;
    Msg refused_;
    Descriptor lock_;
};
