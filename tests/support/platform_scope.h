// Platforms that fail on purpose. Put one in force for the length of a block:
//
//     FullDisc disc(1000);  // takes 1000 bytes, then is full
//     PlatformScope scope(disc);
#pragma once

#include <stdio.h>

#include <cerrno>
#include <string>
#include <thread>

#include "core/arch/platform.h"

class PlatformScope {
  public:
    explicit PlatformScope(QvPlatform& platform) : former_(qv_set_platform(&platform)) {}
    PlatformScope(const PlatformScope&) = delete;
    PlatformScope& operator=(const PlatformScope&) = delete;
    ~PlatformScope() { qv_set_platform(former_); }

  private:
    QvPlatform* former_;
};

// All files that are open for writing together take `room` bytes; then writes fall short and fail as on a
// full disc. Reading works. Must outlive its streams.
class FullDisc : public QvPlatform {
  public:
    explicit FullDisc(long long room) : room_(room) {}

    std::FILE* openFile(const char* name, const char* mode) override {
        std::FILE* const real = QvPlatform::openFile(name, mode);
        if (!real || mode[0] == 'r') return real;
        return fopencookie(new Stream{real, this}, mode, {readReal, writeLimited, seekReal, closeReal});
    }
    int openDescriptor(const char* name, bool writing) override {
        return QvPlatform::openDescriptor(writing ? "/dev/full" : name, writing);
    }
    long long freeSpace(const char*) override { return room_; }

  private:
    struct Stream {
        std::FILE* real;
        FullDisc* disc;
    };
    static Stream& stream(void* cookie) { return *static_cast<Stream*>(cookie); }
    static ssize_t readReal(void* cookie, char* to, size_t size) {
        return static_cast<ssize_t>(std::fread(to, 1, size, stream(cookie).real));
    }
    static ssize_t writeLimited(void* cookie, const char* from, size_t size) {
        long long& room = stream(cookie).disc->room_;
        if (room <= 0) {
            errno = ENOSPC;
            return 0;
        }
        const size_t taken = static_cast<long long>(size) < room ? size : static_cast<size_t>(room);
        room -= static_cast<long long>(taken);
        const size_t done = std::fwrite(from, 1, taken, stream(cookie).real);
        if (taken < size) errno = ENOSPC;  // the C library gives up at a short write
        return static_cast<ssize_t>(done);
    }
    static int seekReal(void* cookie, off64_t* position, int origin) {
        if (fseeko64(stream(cookie).real, *position, origin) != 0) return -1;
        *position = ftello64(stream(cookie).real);
        return 0;
    }
    static int closeReal(void* cookie) {
        const int result = std::fclose(stream(cookie).real);
        delete &stream(cookie);
        return result;
    }

    long long room_;
};

// Starts `limit` threads and no more.
class NoThreads : public QvPlatform {
  public:
    explicit NoThreads(int limit = 0) : left_(limit) {}
    std::thread startThread(std::function<void()> body) override {
        return left_-- > 0 ? QvPlatform::startThread(std::move(body)) : std::thread();
    }

  private:
    int left_;
};

// Gives `limit` blocks and no more.
class NoMemory : public QvPlatform {
  public:
    explicit NoMemory(int limit = 0) : left_(limit) {}
    void* allocate(std::size_t bytes, std::size_t alignment) override {
        return left_-- > 0 ? QvPlatform::allocate(bytes, alignment) : nullptr;
    }

  private:
    int left_;
};
