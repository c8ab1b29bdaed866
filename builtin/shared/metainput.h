// What a decoder of several inputs is opened with: a file that names them, or a set-up from memory.
#pragma once

#include <optional>
#include <string>

#include "core/value/any.h"
#include "core/value/anycontainer.h"

class MetaInput {
  public:
    // `takesState`: whether there are set-ups from memory.
    explicit MetaInput(bool takesState) : takesState_(takesState) {}

    Any filename;        // text; invalid where there is none
    AnyDict state;       // the set-up; empty for none
    AnyDict openParams;  // with which the inputs are opened

    // Takes "filename" (text), "metaState" and "openParameters" (Dicts); nothing for another name. Of the
    // first two the last one counts that was set and is not empty. For a value of another type the status,
    // and for the first two what is wrong in `fault`.
    std::optional<int> set(const char* name, const Any& value, std::string& fault);
    // Answers "filename" and "metaState"; false for another name.
    bool get(const char* name, Any& value) const;

  private:
    bool takesState_;
};
