// Caption pairs as the cc_data structure of a bitstream.
//
//     GA94 03 | 110ccccc FF | hh b1 b2 hh b1 b2 ... | FF      A/53; A/72 has B5 00 31 in front
//             '------------ generic ---------------'
#pragma once

#include "core/caption/cc/qvcc.h"

// QvCcData's detectBufferFmt, byteSize, toBuffer and fromBuffer, with their results.
int qvCcBufferFormat(int size, const unsigned char* data);
int qvCcBufferSize(int fmt, int count);
int qvWriteCcBuffer(const QvCcData& captions, int fmt, int size, unsigned char* data);
int qvReadCcBuffer(QvCcData& captions, int fmt, int size, const unsigned char* data, const MediaTime* t);
// The generic part alone.
int qvReadCcPairs(QvCcData& captions, int size, const unsigned char* data, const MediaTime* t);
