// A fixed set of worker threads that share out the parts of one piece of work, such as bands of a picture.
//
//     qvThreadPool().parallelFor(bands, [&](int band) { convertRows(band * rows, ...); });
#pragma once

#include <memory>
#include <type_traits>

#include "core/arch/api.h"

class QV_API QvThreadPool {
  public:
    // `workers` threads, at least 0, in addition to the callers' own. Fewer if the system gives no more: the
    // work is then done by those that started, if none by the caller alone.
    explicit QvThreadPool(int workers);
    ~QvThreadPool();  // no parallelFor may be running
    QvThreadPool(const QvThreadPool&) = delete;
    QvThreadPool& operator=(const QvThreadPool&) = delete;

    // Calls `task(i)` once for each i from 0 up to but not including `count`, in any order, on the workers
    // and on the caller, and returns when all calls have returned; what they wrote is then visible to the
    // caller. Allocates nothing. A task may itself call parallelFor, on this pool or another. Several threads
    // may call at once. If tasks throw, indices not begun yet are left out and the first exception is thrown
    // again to the caller.
    template <class Task>
    void parallelFor(int count, Task&& task) {
        using Plain = std::remove_reference_t<Task>;
        run(
            count, [](void* context, int index) { (*static_cast<Plain*>(context))(index); },
            const_cast<void*>(static_cast<const void*>(std::addressof(task))));
    }

    // Work that its owner does not wait for where it starts it.
    class Task {
      public:
        // `call` must not throw. `context` is borrowed.
        Task(void (*call)(void* context), void* context) : call_(call), context_(context) {}
        Task(const Task&) = delete;
        Task& operator=(const Task&) = delete;

      private:
        friend class QvThreadPool;
        void (*const call_)(void*);
        void* const context_;
        Task* next_ = nullptr;
        bool waiting_ = false;
    };

    // A worker calls the task once, in the order of starts, when no parallelFor has parts left. The task must
    // stay until its call has returned, or takeBack was true; it may be started again after either. False,
    // and nothing is started, if there are no workers. Allocates nothing.
    bool start(Task& task);
    // True if no worker has begun the task, which is then no longer started.
    bool takeBack(Task& task);

    // How many threads can work at once, the caller counted: the number of bands worth cutting.
    int width() const;

  private:
    using Call = void (*)(void* context, int index);
    struct Job;
    struct State;

    void run(int count, Call call, void* context);

    std::unique_ptr<State> state_;
};

// How many threads share the work on pictures, 1 to kQvMostThreads: the engine's pool has one worker less.
// Each run has a thread of its own besides. 0: as many as there are processors, as without a call. False, and
// nothing is changed, for another number and once the pool is there: set it before the first picture. The key
// "threads" of init_wrapper sets the same.
constexpr int kQvMostThreads = 256;
QV_API bool qvSetThreads(int threads);

// The engine's one pool, made on first use.
QV_API QvThreadPool& qvThreadPool();
