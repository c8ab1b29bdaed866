// Where results go. A job writes into a hidden work folder next to its output; the files get their final
// names only when all of them are complete and on the disk. After a failure or a signal the folder is removed
// with all that it holds; what a run that was ended left is put in order by the next one in that folder.
#pragma once

#include <atomic>
#include <filesystem>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "tarsel/host/outputs/manifest.h"
#include "tarsel/host/outputs/placement.h"
#include "tarsel/host/outputs/workfolder.h"
#include "tarsel/words/numberedname.h"

// How results may be written.
struct OutputPolicy {
    // A week: no job takes so long without writing.
    static constexpr long long kStale = 7LL * 24 * 3600;

    OutputPolicy(bool overwriting) : overwrite(overwriting) {}
    bool overwrite;
    bool sync = true;          // bring results to the disk before what they replace is removed
    bool recover = true;       // put in order what ended runs have left in the folder
    bool quiet = false;        // say nothing of that
    long long stale = kStale;  // seconds after which a work folder of another host was left
};

class Outputs {
  public:
    // `output`: a name given by the user, with the option `option`. `inputs`: files that must not be
    // overwritten. Checks the folder, puts it in order if `policy` says so, and checks that `output` is no
    // input and, unless overwriting, does not exist. Throws Failure.
    Outputs(const std::string& output, const std::string& option, const std::vector<std::string>& inputs,
            const OutputPolicy& policy);
    ~Outputs();
    Outputs(const Outputs&) = delete;
    Outputs& operator=(const Outputs&) = delete;

    // Refuses a final name that exists (unless overwriting) or is an input.
    void checkFinal(const std::filesystem::path& name) const;
    // Refuses existing files of the same numbered name, "card#0007.png" for "card.png".
    void checkNumbered(const std::string& extension) const;
    // That the files are named after numbers ("pic_%04d.png"); what is numbered counts from 0. `name` is that
    // of `output`. Before all that follows.
    void number(const NumberedName& name);
    // That the job writes other files than `output`, or more. Of one file a symbolic link is followed; in a
    // set each name gets a file, and what a link led to is unchanged. Before begin.
    void expectSet() { set_ = true; }

    // What the multiplexer would be given, for asking it for its names; the folder is not there yet.
    std::string hiddenName(const std::string& extension) const;
    // Makes the hidden folder; the name in it that the multiplexer shall write to, with this extension, or
    // with none.
    std::string begin(const std::string& extension);
    // What was written so far, sorted; nothing for a device.
    std::vector<std::filesystem::path> written() const;
    // Gives every written file its final name; one of extension `from` takes the extension of `output`. When
    // overwriting, the files that an earlier run of the same output has left go. Either all is done or, with
    // a Failure, nothing, and then what stood there before stands there again. The final names, `output`
    // first.
    std::vector<std::string> commit(const std::string& from);
    // Whether commit has given all files their names. From any thread.
    bool placed() const { return placed_; }
    // Removes what was written. Safe to call at any time, from any thread, more than once: while files are
    // moved it waits for the end of that.
    void discard();

    // Removes what all objects have written, for a program that can't go on: takes no lock and no memory.
    // What is being moved is left to the next run. False when there was nothing.
    static bool abandonAll();

    // True when `output` is a device or a pipe, which takes exactly one stream.
    bool isDevice() const { return device_; }
    // A message of the engine with the final names in it in place of those in the hidden folder.
    std::string withFinalNames(std::string text) const;
    const std::filesystem::path& output() const { return output_; }
    // The final name of a file in the hidden folder, or of what would be written there.
    std::string finalName(const std::filesystem::path& written, const std::string& from) const;

  private:
    void putInOrder(const std::filesystem::path& folder) const;
    Manifest plan(const std::vector<std::filesystem::path>& files, const std::string& from) const;
    std::string numberedName(const std::string& rest, const std::string& from) const;
    std::vector<std::string> formerNumbers(const std::vector<Manifest::Row>& fresh) const;
    std::vector<std::string> formerSet(const std::vector<Manifest::Row>& fresh) const;
    bool mayGo(const std::filesystem::path& name) const;
    void place(const Manifest& set);
    [[noreturn]] void notPlaced(const PlaceResult& result) const;

    std::filesystem::path output_;
    std::filesystem::path target_;  // where a link leads to that `output_` is; otherwise `output_`
    std::optional<NumberedName> numbered_;
    std::string extension_;  // of the engine's first file
    std::vector<std::string> inputs_;
    OutputPolicy policy_;
    bool device_, set_ = false;
    WorkFolder work_;
    std::atomic<bool> moving_{false};  // the work folder may hold what others own
    std::atomic<bool> placed_{false};
    std::mutex lock_;
};
