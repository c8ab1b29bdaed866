// Where results go. A job writes into a hidden work folder next to its output; the files get their final
// names only when all of them are complete and on the disk. After a failure or a signal the work folder is
// removed with all that it holds. If a run was killed, the next one in that folder cleans up.
#pragma once

#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "tarsel/host/outputs/transaction.h"
#include "tarsel/words/numberedname.h"

// A file of a job that is complete and about to get its name.
struct PlacedFile {
    std::string written;  // where it is until then
    std::string name;     // absolute
};

// How results may be written.
struct OutputPolicy {
    // A week: no job takes so long without writing.
    static constexpr long long kStale = 7LL * 24 * 3600;

    OutputPolicy(bool overwriting) : overwrite(overwriting) {}
    bool overwrite;
    bool keep = false;         // existing files are kept, and the run ends with Exit::done
    bool sync = true;          // bring results to the disk before what they replace is removed
    bool recover = true;       // clean up what killed runs have left in the folder
    bool quiet = false;        // don't report that
    long long stale = kStale;  // seconds after which another host's work folder counts as left over
    // Gets all files of a job before the first one gets its name. If it throws, none does.
    std::function<void(const std::vector<PlacedFile>& files)> placing = {};
};

// The files that are written for one name given by the user: that file, or a set of files with names made
// from it. An output that is no file is a StreamOutput.
class Outputs {
  public:
    // `output`: a name given by the user, with the option `option`. `inputs`: files that must not be
    // overwritten. `with`: the transaction of the job's other outputs; null for a new one. Checks the folder,
    // cleans it up if `policy` says so, and checks that `output` is no input and, unless overwriting, does
    // not exist. Throws Failure.
    Outputs(const std::string& output, const std::string& option, const std::vector<std::string>& inputs,
            const OutputPolicy& policy, std::shared_ptr<Transaction> with = nullptr);
    Outputs(const Outputs&) = delete;
    Outputs& operator=(const Outputs&) = delete;

    // Further files that must not be overwritten, and the check that `output` is none of them.
    void addInputs(const std::vector<std::string>& files);
    // Refuses a final name that exists (unless overwriting) or is an input.
    void checkFinal(const std::filesystem::path& name) const;
    // Names the files by numbers ("pic_%04d.png") that count from 0. `name` is the parsed form of `output`.
    // To be called before the operations below.
    void number(const NumberedName& name);
    // Refuses existing files of the same numbered name, "card#0007.png" for "card.png". An input stays, so it
    // is refused only if one of `count` files, which are numbered from 0, may get its name.
    void checkNumbered(const std::string& extension, long long count) const;
    // Whether `place` (see placeOf) is one of the numbered names of this output.
    bool numbers(const std::string& place, const std::string& extension) const;
    // Says that the job writes several files, or one that is not named `output`. Only a single file follows a
    // symbolic link; in a set each link is replaced by a file, and the file that it led to is unchanged. To
    // be called before begin.
    void expectSet() { set_ = true; }

    // The name that begin would return, with which the multiplexer can be asked for its file names. The
    // folder does not exist yet.
    std::string hiddenName(const std::string& extension) const;
    // Makes the hidden folder. Returns the name in it that the multiplexer is to write to, with this
    // extension, or without one if it is "".
    std::string begin(const std::string& extension);
    // What was written so far, sorted.
    std::vector<std::filesystem::path> written() const;
    // Gives every written file its final name; the extension that begin got becomes that of `output`. When
    // overwriting, files of an earlier run of the same output are removed. After a Failure nothing is
    // changed: the former files are there again.
    void commit();
    // The same for all outputs of a transaction at once.
    static void commit(std::span<Outputs* const> all);
    // After commit: the final names, `output` first.
    const std::vector<std::string>& names() const { return names_; }

    // Operations of the transaction, for all its outputs.
    bool placed() const { return transaction_->placed(); }
    void discard() { transaction_->discard(); }
    bool leave() { return transaction_->leave(); }

    // A message of the engine in which names in the hidden folder are replaced by the final names.
    std::string withFinalNames(std::string text) const;
    const std::filesystem::path& output() const { return output_; }
    // The final name of a file in the hidden folder, or of what would be written there.
    std::string finalName(const std::filesystem::path& written, const std::string& from) const;
    // The absolute path that the final name `name` leads to, in a form that can be compared.
    std::string placeOf(const std::filesystem::path& name) const;

  private:
    void putInOrder(const std::filesystem::path& folder) const;
    bool isInput(const std::filesystem::path& name) const;
    bool mayGo(const std::string& name) const;
    std::filesystem::path targetOf(const std::filesystem::path& name) const;
    std::string numberedName(const std::string& rest, const std::string& from) const;
    void plan();
    std::vector<std::string> formerNumbers(const std::vector<Manifest::Row>& fresh) const;
    std::vector<std::string> formerSet(const std::vector<Manifest::Row>& fresh) const;
    [[noreturn]] void notPlaced(const PlaceResult& result, const std::string& folder) const;

    std::filesystem::path output_;
    std::filesystem::path target_;  // where `output_` leads if it is a link; otherwise `output_`
    std::optional<NumberedName> numbered_;
    std::vector<std::string> inputs_;
    OutputPolicy policy_;
    bool set_ = false;
    std::shared_ptr<Transaction> transaction_;
    Transaction::Place* place_ = nullptr;  // from begin on
    std::string base_;                     // of the files in the hidden folder
    std::string extension_;                // that begin was given
    std::vector<std::string> names_;
    std::vector<PlacedFile> placed_;  // what plan() has found
};
