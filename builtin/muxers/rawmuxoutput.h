// The files that one stream of the elementary stream export makes.
#pragma once

#include "core/stream/auxinfoid.h"
#include "core/stream/qvbufstrm.h"
#include "core/value/anycontainer.h"

// Counts the pictures of a stream that makes a file of each, by listening to their announcements.
struct RawMuxOutput final : QvAuxInfoObserver {
    enum Kind { oneFile, pictureFiles, channelFiles };

    // `count`: digits of the picture numbers, or channels. `stream` must live until release().
    RawMuxOutput(QvBufStream& output, const Any& fullName, Kind filesAre, int countIs, bool isPng = false)
        : name(fullName), kind(filesAre), count(countIs), png(isPng), stream(&output) {
        if (kind == pictureFiles) stream->registerObserver(this);
    }
    ~RawMuxOutput() override { release(); }
    RawMuxOutput(const RawMuxOutput&) = delete;
    RawMuxOutput& operator=(const RawMuxOutput&) = delete;

    void release() {
        if (stream && kind == pictureFiles) stream->unregisterObserver(this);
        stream = nullptr;
    }
    void auxInfo(unsigned, unsigned id, void*, unsigned) override {
        if (id == QvAuxId::VIDEO_AU_CODE) ++pictures;
    }
    // Those that are there.
    void appendFiles(AnyVector& files) const;

    Any name;
    Kind kind;
    int count;
    bool png;
    bool failed = false;  // could not be opened
    int pictures = 0;
    int first = 0;  // number of the first picture

  private:
    Any numbered(int digitCount, int number, const Any& extension) const;

    QvBufStream* stream;
};
