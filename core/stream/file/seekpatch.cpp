#include "core/stream/file/seekpatch_p.h"

#include <array>
#include <cerrno>
#include <cstring>
#include <new>
#include <optional>
#include <vector>

#include "core/stream/auxinfoid.h"
#include "core/stream/file/blockmove_p.h"
#include "core/stream/recordof_p.h"
#include "core/stream/stdfile_p.h"

namespace {

struct Patch {
    int64_t position;
    std::vector<unsigned char> data;
};

class SeekPatch {
  public:
    SeekPatch(bufstream* inner, const QvWideString& name, bool patchable, AuxInfoCallback callback,
              void* context, std::shared_ptr<QvIoFailure> failure)
        : inner_(inner),
          name_(name),
          patchable_(patchable),
          callback_(callback),
          context_(context),
          failure_(std::move(failure)) {}

    unsigned usable() { return inner_->usable(inner_); }
    unsigned char* request(unsigned n) { return inner_->request(inner_, n); }
    unsigned confirm(unsigned n) { return inner_->confirm(inner_, n); }
    unsigned copybytes(unsigned char* p, unsigned n) { return inner_->copybytes(inner_, p, n); }
    unsigned chunksize() { return inner_->chunksize(inner_); }
    unsigned split() { return inner_->split ? inner_->split(inner_) : BUFSTREAM_FAILED; }
    unsigned auxinfo(bufstream*, unsigned offset, unsigned id, void* info, unsigned size);
    void done(int abort);

  private:
    void keepPatch(const void* info);
    void applyPatches();

    bufstream* inner_;
    std::vector<Patch> patches_;
    std::optional<BufReorderInfo> reorder_;
    QvWideString name_;
    bool patchable_;
    AuxInfoCallback callback_;
    void* context_;
    std::shared_ptr<QvIoFailure> failure_;
};

void SeekPatch::keepPatch(const void* info) {
    BufSeekInfo change;
    std::memcpy(&change, info, sizeof change);
    try {
        const auto* data = static_cast<const unsigned char*>(change.data);
        patches_.push_back({change.position, {data, data + change.size}});
    } catch (const std::bad_alloc&) {
        failure_->note(ENOMEM, "No memory for a patch of", name_);
    }
}

unsigned SeekPatch::auxinfo(bufstream*, unsigned offset, unsigned id, void* info, unsigned size) {
    if (id == QvAuxId::BUF_SEEK_INFO && info && size == sizeof(BufSeekInfo)) {
        keepPatch(info);
    } else if (id == QvAuxId::BUF_SEEK_REORDER && info && size >= sizeof(BufReorderInfo)) {
        std::memcpy(&reorder_.emplace(), info, sizeof(BufReorderInfo));
    } else {
        inner_->auxinfo(inner_, offset, id, info, size);
    }
    if (callback_) callback_(context_, offset, id, info, size);
    return 0;
}

void SeekPatch::applyPatches() {
    StdFile file;
    bool ok = file.open(name_, "r+b");
    for (const Patch& patch : patches_) {
        ok = ok && file.seek(patch.position, SEEK_SET) && file.write(patch.data.data(), patch.data.size());
        if (!ok) break;
    }
    if (!file.close()) ok = false;
    if (!ok) failure_->note(file.error(), "Failed to patch", name_);
}

void SeekPatch::done(int abort) {
    if (!patchable_) {
        if (!abort && (!patches_.empty() || reorder_)) failure_->note(ESPIPE, "Failed to patch", name_);
        return;
    }
    try {
        if (!patches_.empty() && !abort) applyPatches();
        if (reorder_) moveBlock(name_, *reorder_, *failure_);
    } catch (const std::bad_alloc&) {
        failure_->note(ENOMEM, "No memory for a patch of", name_);
    }
    patches_.clear();
}

}  // namespace

bufstream* seekPatchNew(bufstream* inner, bool patchable, AuxInfoCallback callback, void* context,
                        std::shared_ptr<QvIoFailure> failure) {
    std::array<unsigned short, longestPatchedName> name{};
    if (inner->auxinfo(inner, 0, QvAuxId::FILE_NAME_INFO, name.data(), sizeof name)) return nullptr;
    if (!name[0]) return nullptr;
    return RecordOf<SeekPatch>::make(
        std::unique_ptr<SeekPatch>(new (std::nothrow) SeekPatch(inner, name.data(), patchable, callback,
                                                                context, std::move(failure))),
        BUFSTREAM_WRITER);
}
