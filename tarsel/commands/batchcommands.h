// The commands of tarsel batch that are more than a few lines. Each adds itself to `batch`; `list` is the
// name of the list, which is there when they run.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

struct JobOptions;
class Command;
class Signals;

using ListName = std::shared_ptr<const std::string>;

// `words`: the whole command line.
void addBatchAdd(Command& batch, Signals& signals, const ListName& list,
                 const std::vector<std::string>& words);
void addBatchRun(Command& batch, Signals& signals, const ListName& list, const std::string& version,
                 const std::string& log);

// submit and cancel.
void addBatchCluster(Command& batch, const ListName& list, const std::string& log);

// Makes the words of a job that was added before it could be planned its options. What `job` says of how it
// is run stays. Throws Failure.
void planWords(const std::vector<std::string>& words, JobOptions& job);
