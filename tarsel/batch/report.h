// The results of a batch as a page for people or as JSON for programs.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "tarsel/batch/result.h"
#include "tarsel/host/outputs/outputs.h"

enum class ReportKind { html, json };
// By the extension of a name. Throws Failure (usage).
ReportKind reportKindOf(const std::string& name);

// The first picture of a task as the bytes of a PNG file, "" for none.
using TaskPicture = std::function<std::string(const BatchTaskResult&)>;
// That of an output that can be read, otherwise that of an input. Files are opened in a process of their own.
std::string firstPicture(const BatchTaskResult& task);

// A page that needs nothing else: its pictures are in it, and it loads nothing, whatever the names in it say.
// Of many tasks only the first ones have pictures.
std::string reportPage(const BatchResult& result, const TaskPicture& picture);
// An object with "list", "start", "seconds", "status" and "tasks"; pictures are data URIs. Times are UTC, and
// null for none.
std::string reportJson(const BatchResult& result, const TaskPicture& picture);

// A report that a run writes when it ends. Its name is checked when the object is made.
class ReportFile {
  public:
    // `inputs` are not overwritten. Throws Failure.
    ReportFile(const std::string& name, const std::vector<std::string>& inputs, const OutputPolicy& policy);
    // Throws Failure; the file is there, whole, when it returns.
    void write(const BatchResult& result, const TaskPicture& picture = firstPicture);

  private:
    std::string name_;
    ReportKind kind_;
    std::unique_ptr<Outputs> outputs_;
};
