// Where results go. A job writes into a hidden folder beside its output; the files get their final names
// only when all of them are complete. After a failure or a signal the folder goes with all it holds.
#pragma once

#include <filesystem>
#include <mutex>
#include <string>
#include <vector>

class Outputs {
  public:
    // `output`: a name given by the user, with the option `option`. `inputs`: files that must not be
    // overwritten. Checks the folder, and that `output` is no input and, unless `overwrite`, does not exist.
    // Throws Failure; makes nothing.
    Outputs(const std::string& output, const std::string& option, const std::vector<std::string>& inputs,
            bool overwrite);
    ~Outputs();
    Outputs(const Outputs&) = delete;
    Outputs& operator=(const Outputs&) = delete;

    // Refuses a final name that exists (unless overwriting) or is an input.
    void checkFinal(const std::filesystem::path& name) const;
    // Refuses existing files of the same numbered name, "card#0007.png" for "card.png".
    void checkNumbered(const std::string& extension) const;

    // What the multiplexer would be given, for asking it for its names; the folder is not there yet.
    std::string hiddenName(const std::string& extension) const;
    // Makes the hidden folder; the name in it that the multiplexer shall write to, with this extension.
    std::string begin(const std::string& extension);
    // What was written so far, sorted; nothing for a device.
    std::vector<std::filesystem::path> written() const;
    // Gives every written file its final name; one of extension `from` takes the extension of `output`.
    // Either all get theirs or, with a Failure, none, and then what stood there before stands there again.
    // The final names, `output` first.
    std::vector<std::string> commit(const std::string& from);
    // Removes what was written. Safe to call at any time, from any thread, more than once: during a commit it
    // waits for its end.
    void discard();

    // Removes what all objects have written, for a program that can't go on: takes no lock and no memory.
    // False when there was nothing.
    static bool abandonAll();

    // True when `output` is a device or a pipe, which takes exactly one stream.
    bool isDevice() const { return device_; }
    // A message of the engine with the final names in it in place of those in the hidden folder.
    std::string withFinalNames(std::string text) const;
    const std::filesystem::path& output() const { return output_; }
    // The final name of a file in the hidden folder, or of what would be written there.
    std::string finalName(const std::filesystem::path& written, const std::string& from) const;

  private:
    void remove();

    std::filesystem::path output_;
    std::string folder_;
    std::vector<std::string> inputs_;
    int folderHandle_ = -1;  // for discarding, which must not need a further one, nor memory
    bool overwrite_, device_;
    std::mutex lock_;
};
