// What one encoder writes its stream to: bytes are gathered, and a unit goes to the film when it is
// announced, or all that comes goes to a log.
#pragma once

#include <memory>

#include "core/stream/qvbufstrm.h"

namespace av {

class FilmWriter;
class UnitLog;

// Takes pieces of any size. Raw sound needs no announcement.
class UnitStream final : public QvBufStream {
  public:
    explicit UnitStream(QvCodec* owner);
    ~UnitStream() override;

    using QvBufStream::init;
    bufstream* input() override;  // null before begin
    bufstream* output() override { return nullptr; }
    void destroy(int abort) override;
    // `film` outlives the stream's use, which destroy ends.
    int begin(FilmWriter& film, std::size_t track);
    // As the `number`-th of its type. `log` outlives the stream's use, too.
    int begin(UnitLog& log, int type, int number);
    // The rest of raw sound. False if there are bytes that no unit was announced for.
    bool finish();

  private:
    class Record;
    class FilmRecord;
    class LogRecord;
    std::unique_ptr<Record> record_;

    int begin(std::unique_ptr<Record> record);
};

}  // namespace av
