// The plan of a join: what the options and the words of its segments mean.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <unordered_map>
#include <vector>

#include "tarsel/job/plan/jobplan.h"
#include "tarsel/job/task/join.h"
#include "tarsel/job/task/joinlevel.h"
#include "tarsel/source/segmentwords.h"

class JoinPlanner {
  public:
    using Opener = std::function<std::unique_ptr<Source>(const std::string& name)>;

    // The options have to outlive it. Throws Failure for options that have no meaning for segments.
    JoinPlanner(const PlanOptions& options, const OutputForm& form, Opener open);

    // Opens the inputs, each once and one at a time, and plans the segments. Throws Failure.
    void plan();
    const Join& join() const { return join_; }
    // The output as a whole, without inputs.
    const JobPlan& whole() const { return whole_; }
    // What the level of the sounds is to be measured by before they are planned again with a gain; null where
    // none is asked for or the options have the gains.
    std::unique_ptr<JoinLevel> level() const;
    // What is read: inputs, and the files of filters.
    const std::vector<std::string>& files() const { return files_; }
    // For messages: the first input, and how many segments there are.
    std::string name() const;

  private:
    size_t segmentCount() const;
    bool levelIsCommon() const;
    std::vector<SegmentWords> words() const;
    int inputNumber(const std::string& name);
    PlanOptions optionsOf(const SegmentWords& words, const std::vector<JobInput>& inputs, bool first,
                          bool last) const;
    void add(const SegmentWords& words, bool first, bool last);
    void planTags();
    void remember(const JobPlan& plan);

    const PlanOptions& options_;
    OutputForm form_;
    Opener open_;
    std::vector<std::string> names_;  // of Join::inputs
    std::unordered_map<std::string, int> numbers_;
    std::vector<JobInput> inputs_;
    KnownFormats known_;
    Join join_;
    JobPlan whole_;
    std::vector<std::string> files_;
};
