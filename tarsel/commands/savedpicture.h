// A picture that a command writes in addition to what it prints.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "tarsel/commands/outputoptions.h"
#include "tarsel/host/outputs/outputs.h"

class QvFrame;
class Signals;

// A name is checked when the object is made, and the file is there when save returns. Throws Failure.
class SavedPicture {
  public:
    // `option` names the file `name`; `inputs` are not overwritten.
    SavedPicture(const std::string& name, const std::string& option, const std::vector<std::string>& inputs,
                 const OutputOptions& options, Signals& signals);
    void save(const QvFrame& picture);

  private:
    std::string name_;
    std::shared_ptr<Outputs> outputs_;
    Signals& signals_;
};
