// Short forms for driving bufstream records in tests.
#pragma once

#include <string_view>

#include "core/stream/bufstream.h"
#include "core/stream/file/qvfilebufstream.h"
#include "core/stream/qvbufstrm.h"
#include "tests/support/checks.h"
#include "tests/support/wav_bytes.h"

inline unsigned char* bytesOf(std::string_view text) {
    return reinterpret_cast<unsigned char*>(const_cast<char*>(text.data()));
}

// By request and confirm; false if there is no block.
inline bool put(bufstream* bs, std::string_view text) {
    unsigned char* block = bs->request(bs, static_cast<unsigned>(text.size()));
    if (!block) return false;
    std::memcpy(block, text.data(), text.size());
    return bs->confirm(bs, static_cast<unsigned>(text.size())) == text.size();
}

inline unsigned copyIn(bufstream* bs, std::string_view text) {
    return bs->copybytes(bs, bytesOf(text), static_cast<unsigned>(text.size()));
}

// By request and confirm; "" if there is no block.
inline std::string take(bufstream* bs, unsigned n) {
    const unsigned char* block = bs->request(bs, n);
    if (!block) return {};
    std::string text(reinterpret_cast<const char*>(block), n);
    bs->confirm(bs, n);
    return text;
}

inline std::string copyOut(bufstream* bs, unsigned n) {
    std::string text(n, '?');
    text.resize(bs->copybytes(bs, bytesOf(text), n));
    return text;
}

inline unsigned usable(bufstream* bs) { return bs->usable(bs); }

// The value, which may be an array, is the info.
template <class T>
unsigned tell(bufstream* bs, unsigned id, const T& value, unsigned offset = 0) {
    return bs->auxinfo(bs, offset, id, const_cast<T*>(&value), sizeof value);
}

inline unsigned tell(bufstream* bs, unsigned id) { return bs->auxinfo(bs, 0, id, nullptr, 0); }

template <class T>
T ask(bufstream* bs, unsigned id) {
    T value{};
    bs->auxinfo(bs, 0, id, &value, sizeof value);
    return value;
}

// A file stream in a folder of its own; most tests write to "a.bin".
struct FileStream : testing::Test {
    bufstream* begin(const std::string& name = "a.bin", int size = 64) {
        EXPECT_EQ(stream.init(AnyDict("outfilename", folder.file(name).c_str(), "size", size)), 0);
        return stream.input();
    }
    std::string bytes(const std::string& name = "a.bin") const { return TempFolder::read(folder.file(name)); }

    TempFolder folder;
    QvFileBufStream stream;
};

struct HeardItems : QvAuxInfoObserver {
    explicit HeardItems(std::vector<std::string>& heard, std::string name = "")
        : heard_(heard), name_(name) {}
    void auxInfo(unsigned offset, unsigned id, void*, unsigned size) override {
        heard_.push_back(name_ + qvAuxInfoName(id) + "/" + std::to_string(offset) + "/" +
                         std::to_string(size));
    }

    std::vector<std::string>& heard_;
    std::string name_;
};
