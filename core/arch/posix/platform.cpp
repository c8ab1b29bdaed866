#include "core/arch/platform.h"

#include <pwd.h>
#include <sys/utsname.h>
#include <unistd.h>
#include <atomic>
#include <cstdlib>
#include <random>

namespace {

std::atomic<QvPlatform*> substitute{nullptr};

// The user database's entry may be long (networks); the buffer grows until it fits.
std::string databaseHome() {
    std::vector<char> buffer(1024);
    passwd entry{};
    passwd* found = nullptr;
    while (getpwuid_r(getuid(), &entry, buffer.data(), buffer.size(), &found) == ERANGE &&
           buffer.size() < (std::size_t{1} << 20))
        buffer.resize(buffer.size() * 2);
    return found && found->pw_dir ? found->pw_dir : "";
}

std::string withoutSeparator(std::string folder) {
    while (folder.size() > 1 && folder.back() == '/') folder.pop_back();
    return folder;
}

}  // namespace

QvPlatform::~QvPlatform() = default;

QvPlatform& qv_platform() {
    // Never destroyed: logs and threads use it until the very end of the process.
    static QvPlatform* const real = new QvPlatform;
    QvPlatform* const other = substitute.load(std::memory_order_acquire);
    return other ? *other : *real;
}

QvPlatform* qv_set_platform(QvPlatform* other) {
    return substitute.exchange(other, std::memory_order_acq_rel);
}

bool QvPlatform::environment(const char* name, std::string& value) {
    const char* const text = std::getenv(name);
    if (!text) return false;
    value = text;
    return true;
}

std::string QvPlatform::homeFolder() {
    std::string folder;
    if (!environment("HOME", folder) || folder.empty()) folder = databaseHome();
    return folder.empty() ? "/" : withoutSeparator(folder);
}

std::string QvPlatform::tempFolder() {
    std::string folder;
    if (!environment("TMPDIR", folder) || folder.empty()) folder = "/tmp";
    return withoutSeparator(folder);
}

bool QvPlatform::isTerminal(std::FILE* stream) {
    const int descriptor = stream ? fileno(stream) : -1;
    return descriptor >= 0 && isatty(descriptor) == 1;
}

void QvPlatform::debugOutput(const char* text) { std::fputs(text, stderr); }

std::string QvPlatform::platformName() {
    utsname facts{};
    if (uname(&facts) != 0) return "unknown";
    const std::string machine = facts.machine;
    const std::string word = machine == "x86_64" ? "x64" : machine == "aarch64" ? "ARM64" : machine;
    return std::string(facts.sysname) + " " + word;
}

std::uint32_t QvPlatform::randomBits() {
    std::random_device entropy;
    return entropy();
}
