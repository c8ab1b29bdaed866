// All that a job writes: its output, the task file, and the files of filters. They are checked before any
// work, so that no input is overwritten and no file is written twice. They get their names together.
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
    // Checks the name of the output. The options have to outlive this object. Throws Failure.
    explicit JobOutputs(const JobOptions& options);

    // What the output's name and the options mean.
    const OutputForm& form() const { return form_; }
    // Checks all names. `inputs`: files that the job reads. `pipe` is asked for the names of its output.
    // Throws Failure.
    void claim(const JobPlan& plan, const std::vector<std::string>& inputs, QvEncodePipe& pipe);

    // After claim: of all files that the job writes, in a form by which places can be compared.
    std::vector<std::string> places() const { return {places_.begin(), places_.end()}; }
    // Null if the output is a stream, or if there is none.
    const Outputs* files() const { return files_.get(); }
    const StreamOutput* stream() const { return stream_.get(); }

    // The name of the output in a stored task, and the one to which the engine writes after begin; "" without
    // an output.
    std::string storedName() const;
    std::string begin();
    // Free bytes for the output; negative if unknown or unlimited.
    long long freeSpace() const;
    // The filters with the files that they write in the hidden folder. Devices are written directly.
    FiltersState begun(FiltersState filters);

    bool hasTask() const { return taskFile_ || taskStream_; }
    bool taskIsStream() const { return taskStream_ != nullptr; }
    // The name to which the engine writes the task file.
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
    // A message of the engine in which the final names replace the hidden ones.
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
