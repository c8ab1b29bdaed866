// From a file name to an open decoder.
#pragma once

#include "core/arch/api.h"
#include "core/decode/qvfileopencb.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QvDecodePipe;

// A file name is a String, a WString, or a Vector of these (a file in several pieces, opened by the first
// extension found). The caller owns what is returned. Null: nothing could be opened; why stands in the debug
// log and went to `cb`, which may be null.
class QV_API QvDecFactory {
  public:
    // Tries the decoders that the registry names for the file's extension (lower case), best first. A valid
    // `fourcc` goes to the decoder as "FOURCC"; non-null `openParams` as "openParameters"; one that does not
    // know them is opened all the same.
    static QvDecodePipe* decodePipe(const Any& filename, const Any& fourcc = Any(),
                                    QvFileOpenCb* cb = nullptr, const Any* openParams = nullptr);
    // Tries these modules in order. Asserts that each name tried is that of a module.
    static QvDecodePipe* decodePipeUsing(const Any& filename, const AnyVector& modules,
                                         const Any& fourcc = Any(), QvFileOpenCb* cb = nullptr,
                                         const Any* openParams = nullptr);
    // Opens a decoder with the parameters and overrides that QvDecodePipe::store wrote. Asserts that `state`
    // names a module.
    //
    // The k-th override of any stream's dictionary goes to stream number k, counting the dictionary's own
    // entries; only with one overridden parameter per stream and stream 0 do they agree.
    static QvDecodePipe* restoreDecoder(const Any& filename, const AnyDict& state,
                                        QvFileOpenCb* cb = nullptr);
};
