// From a file name to an open decoder.
#pragma once

#include <memory>

#include "core/arch/api.h"
#include "core/decode/qvfileopencb.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QvByteSource;
class QvDecodePipe;

// A file name is a String, a WString, or a Vector of these (a file in several pieces, opened by the first
// extension found). The caller owns what is returned. Null: nothing could be opened; the reason is in the
// debug log and went to `cb`, which may be null.
class QV_API QvDecFactory {
  public:
    // Tries the decoders that the registry names for the file's extension (lower case), best first. A valid
    // `fourcc` goes to the decoder as "FOURCC"; non-null `openParams` as "openParameters"; one that does not
    // know them is opened without them.
    static QvDecodePipe* decodePipe(const Any& filename, const Any& fourcc = Any(),
                                    QvFileOpenCb* cb = nullptr, const Any* openParams = nullptr);
    // Tries these modules in order. Asserts that each name tried is that of a module.
    static QvDecodePipe* decodePipeUsing(const Any& filename, const AnyVector& modules,
                                         const Any& fourcc = Any(), QvFileOpenCb* cb = nullptr,
                                         const Any* openParams = nullptr);
    // Opens a file with parameters that the decoder has to accept: `params` are names and values as for
    // setParam; qvParameters lists those of a decoder. An unknown or refused parameter, or a missing one that
    // is needed (the size of a raw file), is an error; nothing is guessed. `module` is the decoder; null:
    // those of the extension in turn, also of files that do not describe themselves, such as ".yuv". Null if
    // none opens the file; then `error`, which may be null, is a text with the reason.
    //
    //     AnyDict format("FOURCC", "I420", "width", 352, "height", 288);
    //     Any error;
    //     QvDecodePipe* clip = QvDecFactory::decodePipeWith(Any("clip.yuv"), format, &error);
    static QvDecodePipe* decodePipeWith(const Any& filename, const AnyDict& params, Any* error = nullptr,
                                        const char* module = nullptr, QvFileOpenCb* cb = nullptr);
    // The same for bytes that are not in a file. The extension of `name` says which decoders are tried;
    // messages use `name` as the file name. The decoder, a memory input ("meminput"), owns the source.
    //
    //     QvDecodePipe* sound = QvDecFactory::decodeSource(qvBlockSource(data, bytes), Any("call.wav"), {},
    //                                                      &error);
    static QvDecodePipe* decodeSource(std::unique_ptr<QvByteSource> source, const Any& name,
                                      const AnyDict& params = AnyDict(), Any* error = nullptr,
                                      const char* module = nullptr);
    // A memory input that is not open, owned by the caller. It takes the parameters "source" (which stays the
    // caller's), "decoder" (the name of a module) or "extension" or a "filename" that has one; open makes
    // that decoder, or the first of the extension that opens, and all operations go to it after that. Other
    // parameters are kept for it until open, which fails if it does not accept one. store does not write the
    // bytes.
    static QvDecodePipe* newMemoryInput();
    // Opens a decoder with the parameters and overrides that QvDecodePipe::store wrote. Asserts that `state`
    // names a module.
    //
    // The k-th override of any stream's dictionary goes to stream number k, counting the dictionary's own
    // entries; only with one overridden parameter per stream and stream 0 do they agree.
    static QvDecodePipe* restoreDecoder(const Any& filename, const AnyDict& state,
                                        QvFileOpenCb* cb = nullptr);
};
