// All that a job writes: its output, the task file, and the files of filters. They are checked before any
// work, so that nothing is written over what the job reads, or twice, and get their names together.
#pragma once

#include <map>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "tarsel/host/outputs/outputs.h"
#include "tarsel/host/outputs/streamoutput.h"
#include "tarsel/job/joboptions.h"
#include "tarsel/job/plan/jobplan.h"

class JobOutputs {
  public:
    // Checks the output as far as its name goes. The options have to outlive this. Throws Failure.
    explicit JobOutputs(const JobOptions& options);

    // What the output's name and the options mean.
    const OutputForm& form() const { return form_; }
    // Checks all names. `inputs`: files that the job reads. `pipe` is asked for the names of its output.
    // Throws Failure.
    void claim(const JobPlan& plan, const std::vector<std::string>& inputs, QvEncodePipe& pipe);

    // After claim: of all files that the job writes, in a form by which places can be compared.
    std::vector<std::string> places() const { return {places_.begin(), places_.end()}; }
    // Null where the output is a stream or nothing.
    const Outputs* files() const { return files_.get(); }
    const StreamOutput* stream() const { return stream_.get(); }

    // The name that the output has in a stored task, and the one that the engine writes to from now on; empty
    // for no output.
    std::string storedName() const;
    std::string begin();
    // Bytes of room for the output; negative when unknown or without bounds.
    long long freeSpace() const;
    // The filters, writing to where their files get their names from. Devices take it as it comes.
    FiltersState begun(FiltersState filters);

    bool hasTask() const { return taskFile_ || taskStream_; }
    bool taskIsStream() const { return taskStream_ != nullptr; }
    // The engine's name for the task file, which is written there from now on.
    std::string beginTask();
    void commitTask();

    // Gives all files their names; see Outputs::commit.
    void commit();
    // Ends all work on them, from any thread; see Transaction::leave.
    bool leave() { return transaction_->leave(); }
    // The final names of the output, after commit.
    std::vector<std::string> names() const;
    // The final name of a file in the hidden folder.
    std::string finalName(const std::filesystem::path& written) const;
    // What the engine says, with the user's names in it.
    std::string withFinalNames(std::string text) const;

  private:
    std::string extension() const { return form_.extension(hasVideo_); }
    void checkNumbers(const JobPlan& plan);
    void checkNames(QvEncodePipe& pipe);
    void claimPlace(const std::string& place, const std::string& name);
    void claimFilterFiles(const std::vector<FilterFiles::Written>& written);
    void claimTask();
    std::unique_ptr<Outputs> makeFile(const std::string& name, const std::string& option) const;

    const JobOptions& options_;
    OutputForm form_;
    bool hasVideo_ = false;
    std::vector<std::string> inputs_;
    std::shared_ptr<Transaction> transaction_ = std::make_shared<Transaction>();
    std::unique_ptr<Outputs> files_, taskFile_;
    std::unique_ptr<StreamOutput> stream_, taskStream_;
    std::map<std::string, std::unique_ptr<Outputs>> dumps_;  // what filters write, by the name that they have
    std::set<std::string> places_;                           // of all that the job writes
    std::string hidden_;                                     // the name that the engine has been given
};
