// Finds files in a folder that are complete, so that they can be processed one by one.
//
//     QvWatchFolderInput input;
//     input.open("/in", QvWatchFolderInput::keep);
//     while (input.nrFiles() > 0) { use(input.nextFile()); input.fileProcessed(); }
//
// Complete means: longer than 0 bytes, and as long as two seconds before. A scan that meets new files
// therefore takes two seconds. One thread at a time.
#pragma once

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QV_API QvWatchFolderInput {
  public:
    // What becomes of a processed file.
    enum Mode {
        keep = 1,  // it stays, and its name is not taken again
        move = 2,  // to another folder, over a file of its name there
        deleteFiles = 3,
    };
    static constexpr int QV_WFINPUT_KEEP = keep;
    static constexpr int QV_WFINPUT_MOVE = move;
    static constexpr int QV_WFINPUT_DELETE = deleteFiles;

    QvWatchFolderInput() = default;
    virtual ~QvWatchFolderInput() = default;

    // Opens a folder, in place of one that is open, and scans it. Only `move` needs `moveTo`, which is made
    // if it does not exist; `extra` is not used. 0; -9 if `folder` is not a folder; -13 without a needed
    // `moveTo`. An unknown mode is an assertion of fileProcessed(), which then leaves the file alone.
    int open(const Any& folder, int mode, const Any* moveTo = nullptr, const Any* extra = nullptr);
    void close();
    bool isOpen() const { return opened_; }

    // Looks for new files. 0, or -18 when not open.
    int scan();
    int nrFiles() const { return queue_.size(); }
    Any nextFile() const;  // the path of the first in the queue, which stays there; invalid if there is none
    // Takes the first file off the queue and does with it what the mode says, then scans. 0; -18 when not
    // open or without a file; -8 when the file could not be moved or deleted, without a scan. With `move` and
    // `deleteFiles` a file that comes back under the same name is not taken again until the next open.
    int fileProcessed();
    void debugDump() const;

  protected:
    // The time between the two looks at a file's length. Returns early, with false, to give a scan up.
    virtual bool waitForWriters(int milliseconds);

  private:
    int _scan();
    void _addEligibleFiles(const AnyVector& names);
    int _postprocess(const Any& path);

    bool opened_ = false;
    int mode_ = 0;
    Any moveTo_;
    Any folder_;
    AnyVector queue_;    // names without path, in the order of discovery
    AnyDict queued_;     // digest of a name to the name
    AnyDict processed_;  // the same, of the files done in mode `keep`
};
