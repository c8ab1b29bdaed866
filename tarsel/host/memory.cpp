#include "tarsel/host/memory.h"

#include <atomic>
#include <new>

namespace {

std::atomic<unsigned> g_refusals{0};

}  // namespace

// The handler is called for the forms of allocation that answer with null as well.
void countMemoryRefusals() {
    std::set_new_handler([] {
        ++g_refusals;
        throw std::bad_alloc();
    });
}

MemoryWatch::MemoryWatch() : before_(g_refusals) {}

bool MemoryWatch::ranOut() const { return g_refusals != before_; }
