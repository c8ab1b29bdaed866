#include "tarsel/host/outputs/transaction.h"

#include <cerrno>
#include <memory>

#include <sys/stat.h>
#include <unistd.h>

#include "tarsel/host/outputs/foldercalls.h"

namespace {

// Those that have a work folder. A process has one, or two while a job is run again.
std::atomic<Transaction*> g_live[8];

[[noreturn]] void waitForTheEnd() {
    for (;;) pause();
}

}  // namespace

Transaction::~Transaction() {
    discard();
    for (Place* place = first_; place;) delete std::exchange(place, place->next);
}

void Transaction::enlist() {
    for (auto& live : g_live) {
        Transaction* none = nullptr;
        enlisted_ = enlisted_ || live.compare_exchange_strong(none, this);
        if (enlisted_) return;
    }
}

// One that is no longer in the list has been taken out by the thread that ends the process, which uses it.
void Transaction::unlist() {
    if (!std::exchange(enlisted_, false)) return;
    for (auto& live : g_live) {
        Transaction* self = this;
        if (live.compare_exchange_strong(self, nullptr)) return;
    }
    waitForTheEnd();
}

int Transaction::make(Place& place) {
    struct stat status;
    if (const int error = place.work.make(place.folder)) return error;
    if (fstat(place.work.place(), &status) != 0) {
        const int error = errno;
        place.work.remove();
        return error;
    }
    place.device = status.st_dev;
    place.number = status.st_ino;
    return 0;
}

int Transaction::enter(const std::string& folder, Place*& place) {
    struct stat status;
    if (stat(folder.c_str(), &status) != 0) return errno;
    const std::lock_guard guard(lock_);
    for (place = first_; place; place = place->next)
        if (place->device == status.st_dev && place->number == status.st_ino) return 0;
    auto made = std::make_unique<Place>();
    made->folder = folder;
    made->next = first_;
    enlist();
    if (const int error = make(*made)) return error;
    place = made.release();
    first_ = place;
    if (state_ != State::ending) return 0;
    place->work.remove();
    waitForTheEnd();
}

bool Transaction::only(const Place& place) const {
    for (const Place* other = first_; other; other = other->next)
        if (other != &place && !other->set.fresh.empty()) return false;
    return true;
}

// Writes the manifest and brings the data to the disk. One file that is all that the job writes is exchanged
// with the old one in one step; of several folders each has to have a way back.
PlaceResult Transaction::prepare(Place& place, bool sync) {
    const Manifest& set = place.set;
    place.single = only(place) && set.fresh.size() == 1 &&
                   (set.old.empty() || (set.old.size() == 1 && set.old[0].name == set.fresh[0].name));
    if (place.single) return {sync ? syncFile(place.work.handle(), set.fresh[0].hidden.c_str()) : 0, {}};
    place.moves.emplace(place.work.handle(), place.work.place(), set, sync);
    return place.moves->prepare();
}

Transaction::Result Transaction::moveAll(bool overwrite, bool sync) {
    Result result;
    for (Place* place = first_; place && result.moved.error == 0; place = place->next) {
        if (place->set.fresh.empty()) continue;
        result.place = place;
        result.moved = place->single ? placeOne(place->work.handle(), place->work.place(),
                                                place->set.fresh[0], overwrite, sync)
                                     : place->moves->run();
        if (result.moved.torn) place->work.leave();
    }
    if (result.moved.error == 0) return result;
    for (Place* place = first_; place != result.place; place = place->next)
        if (place->moves && !place->moves->takeBack()) {
            result.moved.torn = true;
            place->work.leave();
        }
    return result;
}

// Files are brought to the disk before the lock is taken: a second signal must not wait for that.
Transaction::Result Transaction::commit(bool overwrite, bool sync) {
    for (Place* place = first_; place; place = place->next)
        if (!place->set.fresh.empty())
            if (const PlaceResult result = prepare(*place, sync); result.error != 0)
                return {result, false, place};
    const std::lock_guard guard(lock_);
    if (!change(State::writing, State::moving)) {
        if (state_ == State::ending) waitForTheEnd();
        return {{ECANCELED, {}}, true, first_};
    }
    const Result result = moveAll(overwrite, sync);
    placed_ = result.moved.error == 0;
    state_ = State::writing;
    return result;
}

void Transaction::removeAll() {
    for (Place* place = first_; place; place = place->next) place->work.remove();
}

void Transaction::discard() {
    const std::lock_guard guard(lock_);
    if (change(State::writing, State::over)) removeAll();
    if (state_ == State::ending) waitForTheEnd();
    unlist();
}

bool Transaction::leave() {
    const std::lock_guard guard(lock_);
    if (change(State::writing, State::ending)) removeAll();
    return placed_;
}

bool Transaction::abandonAll() {
    bool any = false;
    for (auto& live : g_live) {
        Transaction* const one = live.exchange(nullptr);
        if (!one || !one->change(State::writing, State::ending)) continue;
        one->removeAll();
        any = any || !one->placed_;
    }
    return any;
}
