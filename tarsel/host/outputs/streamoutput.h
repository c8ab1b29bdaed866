// An output that is no file: the standard output, a pipe, a socket, a terminal, a device. It takes one stream
// from its start to its end, and what it has taken stays there.
#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

class StreamOutput {
  public:
    // Names of open files: the shell's redirection makes a plain file of them, which is written as a stream
    // all the same.
    static bool namesDescriptor(const std::string& name);
    // What `output` is when it is no file, null when it is or will be one. "-" is the standard output. Throws
    // Failure for a standard output that is closed or a terminal, and for one that goes into one of `inputs`.
    static std::unique_ptr<StreamOutput> find(const std::string& output,
                                              const std::vector<std::string>& inputs);

    // As the user wrote it.
    const std::string& name() const { return name_; }
    // For the multiplexer.
    std::string engineName() const;
    // The place that it stands for, in a form by which places can be compared.
    std::string place() const;
    bool isStandardOutput() const { return standard_; }
    // The null device: takes anything, even several streams, and keeps nothing.
    bool discards() const { return discards_; }
    // Opens it, waits for a reader where it needs one, and writes all of `bytes`. 0 or an errno.
    int write(std::string_view bytes) const;
    // A message of the engine with the user's name in it.
    std::string withUserName(std::string text) const;

  private:
    std::string name_;
    bool standard_ = false, discards_ = false;
};
