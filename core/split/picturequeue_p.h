// Pictures on their way to numbered PNG files, packed on several threads at once.
#pragma once

#include <condition_variable>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

class QvCancel;
class QvFrame;
class QvThreadPool;

// Packs pictures on the workers of a pool, and on the caller when these have enough to do, and writes the
// files one after the other in the order of the pictures. After a failure no file is written any more. put(),
// finish() and drop() are for one thread.
class PictureQueue {
  public:
    struct Failure {
        bool happened = false;
        bool opened = false;  // the file could be opened
        int code = 0;         // an errno value, 0 if the system has no reason
        std::string name;     // of the file
    };

    // Pictures of this size, in BGR3.
    PictureQueue(QvThreadPool& pool, int width, int height);
    ~PictureQueue();  // drops
    PictureQueue(const PictureQueue&) = delete;
    PictureQueue& operator=(const PictureQueue&) = delete;

    // Copies the picture, and waits only while as many are on their way as there is room for. False if this
    // one or an earlier one has failed by now. std::bad_alloc if there is no room for a single one.
    bool put(const QvFrame& picture, std::string name, const std::shared_ptr<QvCancel>& cancel);
    // Returns when all files are written. False if one failed since the start.
    bool finish();
    // Files that nobody has begun are not written any more. Returns when no thread is at work.
    void drop();
    // Of the first picture that failed. To be asked after false.
    const Failure& failure() const { return failure_; }

  private:
    struct Slot;

    Slot* freeSlot(std::unique_lock<std::mutex>& hold);
    Slot* makeSlot();
    void helpOrWait(std::unique_lock<std::mutex>& hold);
    void pack(Slot& slot);
    void writeReady(std::unique_lock<std::mutex>& hold);
    static Failure write(Slot& slot) noexcept;

    QvThreadPool& pool_;
    const int width_, height_;
    size_t most_;  // slots that there may be

    std::mutex lock_;  // guards all that follows
    std::condition_variable moved_;
    std::vector<std::unique_ptr<Slot>> slots_;
    unsigned long long next_ = 0;     // number of the picture that comes next
    unsigned long long written_ = 0;  // of the one that is written next
    bool writing_ = false;
    bool dropping_ = false;
    Failure failure_;
};
