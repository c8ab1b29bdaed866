// What is made of each file of a watched folder: one output for each preset.
#pragma once

#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

class WatchTargets {
  public:
    // `given`: presets as NAME or NAME:FOLDER. Without a folder the outputs go to a folder of the preset's
    // name in `base`. `watched`: the folder of the inputs, as realName gives it. Throws Failure, also where
    // two targets would write the same files, or one would write into `watched`.
    WatchTargets(const std::vector<std::string>& given, const std::string& base, const std::string& watched);

    int count() const { return task_.nrTargets(); }
    // Throws Failure (output).
    void makeFolders() const;
    std::string preset(int target) const { return task_.preset(target).name(); }
    const std::string& folder(int target) const { return rows_[static_cast<size_t>(target)].folder; }
    // The preset and the folder: what a file has to be made for once.
    std::string label(int target) const { return preset(target) + "\t" + folder(target); }
    // Whether outputs() needs to know what is in the input.
    bool dependsOnStreams(int target) const { return rows_[static_cast<size_t>(target)].raw; }
    // What may be written for an input, the name of the output first. `soundOnly`: the input has no picture.
    // In the names '%' and '\' become '_', as they have a meaning in the names of outputs.
    std::vector<std::string> outputs(int target, const std::string& input, bool soundOnly) const;

  private:
    struct Row {
        std::string folder, extension;
        bool raw;  // pictures or sound as they are, which have extensions of their own
    };
    QvWatchTask task_;
    std::vector<Row> rows_;
};
