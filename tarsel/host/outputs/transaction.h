// Gives the files of a job their names: all of them, or none. A job has one work folder in each folder to
// which it writes, with one manifest for all files that go there. After a failure or a signal the work
// folders are removed with all that they hold.
#pragma once

#include <atomic>
#include <mutex>
#include <optional>
#include <string>

#include <sys/types.h>

#include "tarsel/host/outputs/manifest.h"
#include "tarsel/host/outputs/placement.h"
#include "tarsel/host/outputs/workfolder.h"

class Transaction {
  public:
    // One folder that gets files of the job.
    struct Place {
        std::string folder;  // around the work folder, as the user named it
        WorkFolder work;
        size_t members = 0;  // outputs that write here
        Manifest set;        // the files to rename

      private:
        friend class Transaction;
        dev_t device = 0;
        ino_t number = 0;
        bool single = false;  // one file, which needs no manifest
        std::optional<SetPlacement> moves;
        Place* next = nullptr;
    };

    struct Result {
        PlaceResult moved;
        bool synced = true;            // false: the disk did not take the data, and nothing was moved
        const Place* place = nullptr;  // where it failed
    };

    Transaction() = default;
    ~Transaction();
    Transaction(const Transaction&) = delete;
    Transaction& operator=(const Transaction&) = delete;

    // The work folder of this job in `folder`, made by the first call. 0 or an errno.
    int enter(const std::string& folder, Place*& place);
    // Gives the files of all places their names. After a failure all that was moved is moved back, except in
    // a place whose result is torn: its work folder stays. To be called once.
    Result commit(bool overwrite, bool sync);
    // Whether all files have their names. From any thread.
    bool placed() const { return placed_; }
    // Removes the work folders. At any time, from any thread, any number of times; waits while files are
    // being moved.
    void discard();

    // The same for a process that is about to end: another thread that uses the transaction afterwards waits
    // for that end, so that it reports nothing that is missing. Whether all files had their names.
    bool leave();
    // The same for all transactions, by a program that can't continue: takes no lock and no memory. What is
    // being moved is left to the next run. False when there was nothing.
    static bool abandonAll();

  private:
    // Which thread may change the work folders. Changes of state are atomic, so that a placement and the end
    // of the process can't both begin.
    enum class State : unsigned char {
        writing,
        moving,
        over,    // they are being removed by their owner, or gone
        ending,  // by a thread that ends the process
    };

    bool change(State from, State to) { return state_.compare_exchange_strong(from, to); }
    int make(Place& place);
    PlaceResult prepare(Place& place, bool sync);
    Result moveAll(bool overwrite, bool sync);
    bool only(const Place& place) const;
    void removeAll();
    void enlist();
    void unlist();

    std::atomic<Place*> first_{nullptr};
    std::atomic<State> state_{State::writing};
    std::atomic<bool> placed_{false};
    bool enlisted_ = false;  // guarded by lock_
    std::mutex lock_;
};
