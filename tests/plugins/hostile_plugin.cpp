// Does in its start what the variable QV_TEST_START says.
#include <csignal>
#include <cstdlib>
#include <stdexcept>
#include <string>

#include "core/engine/modules/qvplugin.h"

namespace {

volatile int depth = 0;

int overflow(int n) {
    volatile char block[4096];
    block[0] = static_cast<char>(n);
    depth = depth + 1;
    return depth > 0 ? overflow(n + 1) + block[0] : 0;
}

void act(const std::string& when) {
    const char* const variable = std::getenv("QV_TEST_START");
    const std::string way = variable ? variable : "";
    if (way.rfind(when, 0) != 0) return;
    const std::string what = way.substr(when.size());
    if (what == "exit") std::exit(0);
    if (what == "quick_exit") std::quick_exit(0);
    if (what == "trap") std::raise(SIGTRAP);
    if (what == "system call") std::raise(SIGSYS);
    if (what == "abort") std::abort();
    if (what == "throw") throw std::runtime_error("no licence\033[2J");
    if (what == "overflow") depth = overflow(0);
    if (what == "crash") std::raise(SIGSEGV);
    if (what == "fault") *reinterpret_cast<volatile int*>(static_cast<std::size_t>(depth) + 8) = 1;
}

struct Early {
    Early() { act("before main: "); }
} early;

}  // namespace

extern "C" QV_API QvPlugin* plugin_init() {
    act("entry: ");
    static QvPlugin plugin("hostile", "Lets its host down");
    return &plugin;
}
