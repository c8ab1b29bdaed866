// The standard input as an input, given as "-": bytes that can be read at any place and more than once.
#pragma once

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include <qvplugcore/qvplugcore.h>

class StandardInput {
  public:
    static constexpr const char* kName = "-";

    // `format`: an extension that says what it holds, without the dot; empty where it was not given.
    explicit StandardInput(std::string format) : format_(std::move(format)) {}
    StandardInput(const StandardInput&) = delete;
    StandardInput& operator=(const StandardInput&) = delete;
    ~StandardInput();

    const std::string& format() const { return format_; }

    // Takes all of it when it is called first. A regular file is used where it is, from its present position
    // on; anything else is kept in a file without a name in the temporary folder, which is gone when the
    // process ends, however it ends. Throws Failure; then there is nothing to read.
    void take();
    // After take().
    long long bytes() const { return bytes_; }
    std::string firstBytes(size_t most) const;
    // What the decoder reads; this has to outlive it.
    std::unique_ptr<QvByteSource> source() const;
    // The name of the file that it is; empty for anything else.
    const std::string& file() const { return file_; }

  private:
    std::string format_, file_;
    int kept_ = -1;        // the file without a name; -1 for none
    int number_ = -1;      // the descriptor that is read
    long long start_ = 0;  // of the first byte
    long long bytes_ = -1;

    void keep();
};

// The one that `inputs` name; null if they do not. Throws Failure (usage) if they name it twice, or if a
// format is given for nothing.
std::shared_ptr<StandardInput> standardInputOf(const std::vector<std::string>& inputs,
                                               const std::string& format);
