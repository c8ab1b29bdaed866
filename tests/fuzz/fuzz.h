// What the harnesses share: a condition that ends the run, and input as a file.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

#include <sys/mman.h>
#include <unistd.h>

inline void require(bool holds) {
    if (!holds) std::abort();
}

// A file in memory that can be opened any number of times, by a name with the extension if one is given.
class MemoryFile {
  public:
    explicit MemoryFile(const std::string& extension = "") : descriptor_(memfd_create("fuzz", 0)) {
        const std::string file = "/proc/self/fd/" + std::to_string(descriptor_);
        if (!extension.empty()) link_ = "/tmp/fuzz-" + std::to_string(getpid()) + extension;
        require(descriptor_ >= 0 && (link_.empty() || symlink(file.c_str(), link_.c_str()) == 0));
        name_ = link_.empty() ? file : link_;
    }
    MemoryFile(const std::uint8_t* data, std::size_t size, const std::string& extension = "")
        : MemoryFile(extension) {
        require(pwrite(descriptor_, data, size, 0) == static_cast<ssize_t>(size));
    }
    MemoryFile(const MemoryFile&) = delete;
    MemoryFile& operator=(const MemoryFile&) = delete;
    ~MemoryFile() {
        close(descriptor_);
        unlink(link_.c_str());
    }

    const char* name() const { return name_.c_str(); }
    std::string read() const {
        std::string bytes(static_cast<std::size_t>(lseek(descriptor_, 0, SEEK_END)), 0);
        require(pread(descriptor_, bytes.data(), bytes.size(), 0) >= 0);
        return bytes;
    }

  private:
    int descriptor_;
    std::string link_, name_;
};
