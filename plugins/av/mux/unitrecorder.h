// Writes what encoders give it to a log, of which a multiplexer of this plug-in makes the film afterwards
// (QvFileMuxStream::recorded). Module "unitmux".
#pragma once

#include <memory>

#include "core/encode/basemuxer.h"

namespace av {

class UnitLog;

// Any number of streams of pictures and sound, of any encoder, raw ones too. What is aborted has no end and
// is refused when it is read.
class UnitRecorder final : public BaseMuxer {
  public:
    UnitRecorder();
    ~UnitRecorder() override;

    void getParam(const char* name, Any& value) const override;
    using QvCodec::getParam;
    void store(AnyDict& state) const override;
    int restore(const AnyDict& state) override;

    QvBufStream* addStream(int type, const AnyDict& params) override;
    int open() override;
    int close() override;
    int abort() override;

  private:
    std::unique_ptr<UnitLog> log_;

    template <class Do>
    void forAll(Do&& what);
    void end();
};

}  // namespace av
