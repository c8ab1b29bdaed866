// Where results go. A job writes into a hidden folder beside its output; the files get their final names
// only when all of them are complete. After a failure or a signal the folder goes with all it holds.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

class Outputs {
  public:
    // `output`: the name given with -o. `inputs`: files that must not be overwritten. Checks the folder and,
    // unless `overwrite`, that neither `output` nor any of `finals` exists. Throws Failure; makes nothing.
    Outputs(const std::string& output, const std::vector<std::string>& inputs, bool overwrite);
    ~Outputs();
    Outputs(const Outputs&) = delete;
    Outputs& operator=(const Outputs&) = delete;

    // Refuses a final name that exists (unless overwriting) or is an input.
    void checkFinal(const std::filesystem::path& name) const;
    // Refuses existing pictures of the same numbered name, "card#0007.png" for "card.png".
    void checkNumbered(const std::string& extension) const;

    // Makes the hidden folder; the name in it that the multiplexer shall write to, with this extension.
    std::string begin(const std::string& extension);
    // Gives every written file its final name. A file of extension `from` takes the extension of `output`.
    // The final names, sorted. Throws Failure, with what was done so far undone as far as it can be.
    std::vector<std::string> commit(const std::string& from);
    // Removes what was written. Safe to call at any time, from any thread, more than once.
    void discard();

    // True when `output` is a device or a pipe, which takes exactly one stream.
    bool isDevice() const;
    // A message of the engine with the final names in it in place of those in the hidden folder.
    std::string withFinalNames(std::string text) const;
    const std::filesystem::path& output() const { return output_; }
    std::string finalName(const std::filesystem::path& written, const std::string& from) const;

  private:
    std::filesystem::path output_, folder_;
    std::vector<std::string> inputs_;
    bool overwrite_;
};
