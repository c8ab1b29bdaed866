// What decoders have learned about files (an index, say), kept in a folder so that a later run need not scan
// them again. The engine keeps none by itself: it is a service for applications and plug-ins.
//
//     FOLDER/NAME/                              the manager's path
//         0123456789abcdef0123456789abcdef/     MD5 of the file's name, lower case
//             state.xml                         root "decoderState", version "2.0"
//             KEY.dat                           gzip, one for each block of more than 128 bytes whose key
//                                               can be the name of a file
//
// A kept state is void as soon as the file's modification time differs, and whatever is inconsistent counts
// as not stored: its folder is removed. Nothing locks; two managers on one folder are not guarded against
// each other.
#pragma once

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

// Names and values of a decoder's choice.
class QV_API QvDecoderState : public AnyDict {
  public:
    QvDecoderState() = default;
    explicit QvDecoderState(const AnyDict& values) : AnyDict(values) {}
    ~QvDecoderState() override;
};

class QV_API QvDecoderStateManager {
  public:
    // Keeps states in `dir`/`name`; without `dir`, in the folder "decstate" of the user's settings. The
    // folder is made; if that fails, the user log says so and the manager acts as if nothing were ever
    // stored.
    explicit QvDecoderStateManager(const char* name, const Any& dir = Any());

    // A valid state is there; a stale one is removed.
    bool stateStored(const Any& file);
    // Replaces what is kept for that file. 0, or QvStatus::failed. A block that can't be written is left out.
    int storeState(const Any& file, const QvDecoderState& state);
    // Replaces `state`. 0, or QvStatus::failed.
    int restoreState(const Any& file, QvDecoderState& state);
    int deleteState(const Any& file);
    // Removes all kept states; other files and folders stay.
    void clearStates();

    const Any& path() const { return path_; }
    bool disabled() const { return disabled_; }

  private:
    Any path_;
    bool disabled_ = false;

    Any _fileStateDir(const Any& file) const;
    bool _stateStored(const Any& file, AnyDict* out);
    bool _shouldBeStoredAsBlob(const char* name, const Any& value) const;
    int _storeBlob(const Any& file, const char* key, const Any& value, AnyDict& out);
    int _restoreBlob(const Any& file, const char* name, Any& out);
};
