// The record in which statistics of a first pass are kept until the second one.
#pragma once

#include <string>
#include <string_view>

#include "core/stream/bufstream.h"

namespace av {

// One of the record's slots, 0 to 7. False if it can't be written, or holds nothing.
bool storePass(bufstream& record, unsigned slot, std::string_view text);
bool loadPass(bufstream& record, unsigned slot, std::string& text);

// Files of a library that knows only names. They lie in the folder for temporary files for as long as the
// object lives.
class PassFiles {
  public:
    PassFiles() = default;
    ~PassFiles() { remove(); }
    PassFiles(const PassFiles&) = delete;
    PassFiles& operator=(const PassFiles&) = delete;

    const std::string& choose();  // a new name
    bool save(bufstream& record) const;
    bool restore(bufstream& record);
    void remove();

  private:
    std::string name_;
};

}  // namespace av
