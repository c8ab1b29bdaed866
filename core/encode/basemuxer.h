// The book-keeping that multiplexers share: the attached output and the list of bitstreams of each type.
// A subclass implements addStream, open and close.
#pragma once

#include <array>
#include <memory>
#include <vector>

#include "core/encode/qvmuxer.h"
#include "core/stream/qvbufstrm.h"

class QV_API BaseMuxer : public QvMuxer {
  public:
    explicit BaseMuxer(const QvModule* module = nullptr);
    ~BaseMuxer() override;

    int attachOutStream(QvBufStream* stream) override;
    int detachOutStream() override;
    // Types 1, 2, 4: the size of that list. 0 and 255: all streams. Anything else: 0.
    int nrStreams(int type) const override;
    // Asserts a type or number that is not there.
    QvBufStream* stream(int type, int nr) const override;
    // Both delete the bitstream objects, so an encoder is detached before.
    void removeStreams(int mask) override;
    void removeStream(int type, int nr) override;

  protected:
    using StreamList = std::vector<std::unique_ptr<QvBufStream>>;
    static constexpr std::array<int, 3> streamTypes = {qvVideoStream, qvAudioStream, qvSubpicStream};

    // The list of a type; asserts another value.
    StreamList& list(int type);
    const StreamList& list(int type) const;
    // Appends to the type's list and returns the stream.
    QvBufStream* keep(int type, std::unique_ptr<QvBufStream> stream);
    bool anyEnabled() const;

  private:
    std::array<StreamList, 3> lists_;
};
