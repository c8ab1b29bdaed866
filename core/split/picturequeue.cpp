#include "core/split/picturequeue_p.h"

#include <algorithm>
#include <cerrno>
#include <new>
#include <utility>

#include "core/engine/threads/qvthreadpool.h"
#include "core/image/picturefile_p.h"
#include "core/image/pngencoder_p.h"
#include "core/media/qvframe.h"

namespace {

// A thread has the next picture at hand when it has packed one; beyond this, room for two of any size.
constexpr size_t slotsPerThread = 2;
constexpr size_t mostBytes = size_t{256} << 20;

}  // namespace

struct PictureQueue::Slot {
    enum State { free, waiting, packing, ready };

    explicit Slot(PictureQueue& owner) : queue(&owner) {}

    PictureQueue* queue;
    State state = free;
    unsigned long long number = 0;
    std::string name;
    std::shared_ptr<QvCancel> cancel;
    PngEncoder encoder;
    QvThreadPool::Task task{[](void* slot) {
                                auto* self = static_cast<Slot*>(slot);
                                self->queue->pack(*self);
                            },
                            this};
};

PictureQueue::PictureQueue(QvThreadPool& pool, int width, int height)
    : pool_(pool), width_(width), height_(height) {
    const auto threads = static_cast<size_t>(pool.width());
    const size_t fitting = mostBytes / (PngEncoder::memoryFor(std::max(width, 1), std::max(height, 1)) + 1);
    most_ = threads == 1 ? 1 : std::max<size_t>(2, std::min(threads * slotsPerThread, fitting));
    slots_.reserve(most_);
}

PictureQueue::~PictureQueue() { drop(); }

// Null if there is no memory for one more: those that there are have to do.
PictureQueue::Slot* PictureQueue::makeSlot() {
    try {
        auto slot = std::make_unique<Slot>(*this);
        if (slot->encoder.prepare(width_, height_)) return slots_.emplace_back(std::move(slot)).get();
    } catch (const std::bad_alloc&) {
    }
    if (slots_.empty()) throw std::bad_alloc();
    most_ = slots_.size();
    return nullptr;
}

// The caller packs a picture itself rather than wait for one that no worker has begun.
void PictureQueue::helpOrWait(std::unique_lock<std::mutex>& hold) {
    Slot* oldest = nullptr;
    for (const auto& slot : slots_)
        if (slot->state == Slot::waiting && (!oldest || slot->number < oldest->number)) oldest = slot.get();
    if (!oldest || !pool_.takeBack(oldest->task)) return moved_.wait(hold);
    hold.unlock();
    pack(*oldest);
    hold.lock();
}

PictureQueue::Slot* PictureQueue::freeSlot(std::unique_lock<std::mutex>& hold) {
    for (;;) {
        for (const auto& slot : slots_)
            if (slot->state == Slot::free) return slot.get();
        if (slots_.size() < most_)
            if (Slot* made = makeSlot()) return made;
        helpOrWait(hold);
    }
}

bool PictureQueue::put(const QvFrame& picture, std::string name, const std::shared_ptr<QvCancel>& cancel) {
    std::unique_lock hold(lock_);
    Slot* const slot = freeSlot(hold);
    if (failure_.happened) return false;
    hold.unlock();
    slot->encoder.take(picture);
    slot->name = std::move(name);
    slot->cancel = cancel;
    hold.lock();
    slot->number = next_++;
    slot->state = Slot::waiting;
    if (!pool_.start(slot->task)) {
        hold.unlock();
        pack(*slot);
        hold.lock();
    }
    return !failure_.happened;
}

void PictureQueue::pack(Slot& slot) {
    std::unique_lock hold(lock_);
    slot.state = Slot::packing;
    if (!dropping_ && !failure_.happened) {
        hold.unlock();
        slot.encoder.compress();
        hold.lock();
    }
    slot.state = Slot::ready;
    writeReady(hold);
    moved_.notify_all();
}

// One thread writes at a time: the one that finds the next picture ready, and then whatever has become ready
// meanwhile.
void PictureQueue::writeReady(std::unique_lock<std::mutex>& hold) {
    while (!writing_) {
        const auto next = std::find_if(slots_.begin(), slots_.end(), [this](const auto& slot) {
            return slot->state == Slot::ready && slot->number == written_;
        });
        if (next == slots_.end()) return;
        Slot& slot = **next;
        if (!dropping_ && !failure_.happened) {
            writing_ = true;
            hold.unlock();
            Failure failure = write(slot);
            hold.lock();
            writing_ = false;
            failure_ = std::move(failure);
        }
        slot.state = Slot::free;
        ++written_;
        moved_.notify_all();
    }
}

// Takes no memory to tell of a failure.
PictureQueue::Failure PictureQueue::write(Slot& slot) noexcept {
    Failure failure;
    try {
        PictureFile file;
        failure.opened = file.open(slot.name, slot.cancel);
        if (failure.opened) {
            errno = 0;
            if (file.finish(slot.encoder.write(file.get()))) return failure;
        }
        failure.code = errno;
    } catch (const std::bad_alloc&) {
        failure.code = ENOMEM;
    }
    failure.happened = true;
    failure.name = std::move(slot.name);
    return failure;
}

bool PictureQueue::finish() {
    std::unique_lock hold(lock_);
    while (written_ < next_) helpOrWait(hold);
    return !failure_.happened;
}

void PictureQueue::drop() {
    {
        const std::lock_guard hold(lock_);
        dropping_ = true;
    }
    finish();
    dropping_ = false;
}
