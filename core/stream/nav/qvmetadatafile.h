// QvMetadataFile: up to eight side files, NAME.md0 to NAME.md7, in which an encoder keeps what it wants to
// find again during the same job, as statistics of a first pass.
#pragma once

#include <memory>

#include "core/arch/api.h"
#include "core/stream/bufstream.h"
#include "core/value/any.h"

// The record has the shape of a bufstream and answers auxinfo alone: METADATA_... with the slot as `offset`.
using metadata_storage = bufstream;

class QV_API QvMetadataFile {
  public:
    QvMetadataFile();
    QvMetadataFile(const QvMetadataFile&);
    QvMetadataFile& operator=(const QvMetadataFile&);
    ~QvMetadataFile();

    // `name` has 1 to 2,047 characters, else an assertion fails. A dummy has a name and no record.
    int init(const Any& name, bool dummy);
    // Closes and deletes the side files of this record. Other files of such names stay.
    void destroy(int abort);
    metadata_storage* metadata() const;  // null for a dummy; valid until destroy
    bool inited() const { return inited_; }
    bool isDummy() const { return dummy_; }
    const Any& filename() const { return name_; }

  private:
    struct Holder;
    std::shared_ptr<Holder> holder_;
    Any name_;
    bool inited_ = false;
    bool dummy_ = false;
};
