// What a job warns of. It is said at the end; with --strict it makes the job fail.
#pragma once

#include <functional>
#include <string>
#include <vector>

class Warnings {
  public:
    explicit Warnings(std::vector<std::string> lines) : lines_(std::move(lines)) {}

    void add(const std::string& line) { lines_.push_back(line); }
    void add(const std::vector<std::string>& lines);
    // The engine's messages for its user since the last time, each line once. `named` puts the user's file
    // names into a sentence of the engine.
    void addEngine(const std::function<std::string(std::string)>& named);

    // Those about plug-ins, which were said already, count as well.
    std::size_t count() const;
    void show() const;
    // Under --strict: shows them unless `quiet`, and throws Failure, if there are any. `output`: its name.
    void refuse(bool quiet, const std::string& output) const;

  private:
    std::vector<std::string> lines_;
};
