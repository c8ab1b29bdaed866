// The input side of one output stream: a stream of a decoder, and what is to happen to it.
#pragma once

#include "core/arch/api.h"
#include "core/job/processparams.h"
#include "core/measure/mediatime.h"
#include "core/value/any.h"
#include "core/value/ptrlist.h"

class QvDecodePipe;

// The decoder belongs to the caller and outlives the stream. Times are at MediaTime::defaultTimescale, also
// where stored points have another one, and never negative.
class QV_API QvIStream {
  public:
    QvIStream() = default;
    QvIStream(QvDecodePipe* decoder, int type, int number) : decoder(decoder), type(type), number(number) {}
    QvIStream(const QvIStream&) = default;
    QvIStream& operator=(const QvIStream&) = default;
    virtual ~QvIStream();

    Any filename() const;  // the decoder's "filename"; invalid without a decoder
    // The first pair of the points; 0 where there is none.
    MediaTime inPoint() const;
    // Where there is none, or it is 0, the end of the stream.
    MediaTime outPoint() const;
    void setInPoint(const MediaTime& time);
    void setOutPoint(const MediaTime& time);
    MediaTime duration() const;  // of the whole stream, no shorter than its last frame or sample
    // From the in point to the out point, or to the end if that is earlier.
    MediaTime effectiveDuration() const;

    // The same stream of the same decoder; points and filters are not compared.
    bool operator==(const QvIStream& other) const;

    QvDecodePipe* decoder = nullptr;
    int type = 0;  // QvStreamType
    int number = 0;
    ProcessParams params;
};

using QvIStreamList = TPtrList<QvIStream>;
