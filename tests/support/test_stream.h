// An output stream for encoders that keeps what it gets and can be made to stall or fail.
#pragma once

#include <algorithm>
#include <condition_variable>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

#include "core/stream/qvbufstrm.h"

class TestStream : public QvBufStream {
  public:
    explicit TestStream(QvCodec* owner = nullptr) : QvBufStream(owner) {
        record_.usable = [](bufstream*) { return 1u << 30; };
        record_.request = [](bufstream* s, unsigned n) { return of(s).request(n); };
        record_.confirm = [](bufstream* s, unsigned n) { return of(s).confirm(n); };
        record_.copybytes = [](bufstream* s, unsigned char* p, unsigned n) { return of(s).copy(p, n); };
        record_.chunksize = [](bufstream* s) { return of(s).chunk; };
        record_.auxinfo = [](bufstream* s, unsigned, unsigned id, void* info, unsigned size) {
            return of(s).auxinfo(id, info, size);
        };
        record_.context = this;
    }

    bufstream* input() override { return &record_; }
    bufstream* output() override { return nullptr; }

    // Every write waits at the gate while it is shut.
    void shut() { setGate(false); }
    void open() { setGate(true); }
    void waitForWriter() {
        std::unique_lock lock(gateLock_);
        gateMoved_.wait(lock, [this] { return waiting_; });
    }

    struct Unit {
        unsigned id;
        unsigned bytes;  // the first word of the info, 0 without one
        unsigned infoSize;
        bool operator==(const Unit&) const = default;
    };

    std::string data;
    std::vector<Unit> units;
    unsigned chunk = 1u << 30;
    size_t failAfter = SIZE_MAX;  // bytes that fit; after that no block and short counts

  private:
    static TestStream& of(bufstream* record) { return *static_cast<TestStream*>(record->context); }

    void setGate(bool isOpen) {
        const std::lock_guard lock(gateLock_);
        gateOpen_ = isOpen;
        gateMoved_.notify_all();
    }
    void passGate() {
        std::unique_lock lock(gateLock_);
        waiting_ = !gateOpen_;
        gateMoved_.notify_all();
        gateMoved_.wait(lock, [this] { return gateOpen_; });
        waiting_ = false;
    }
    unsigned char* request(unsigned n) {
        passGate();
        if (data.size() + n > failAfter) return nullptr;
        block_.resize(n);
        return block_.data();
    }
    unsigned confirm(unsigned n) {
        data.append(block_.begin(), block_.begin() + n);
        return n;
    }
    unsigned copy(const unsigned char* p, unsigned n) {
        passGate();
        if (data.size() + n > failAfter) return 0;
        data.append(p, p + n);
        return n;
    }
    unsigned auxinfo(unsigned id, const void* info, unsigned size) {
        units.push_back({id, info ? *static_cast<const unsigned*>(info) : 0, size});
        return 0;
    }

    bufstream record_{};
    std::vector<unsigned char> block_;
    std::mutex gateLock_;
    std::condition_variable gateMoved_;
    bool gateOpen_ = true;
    bool waiting_ = false;
};
