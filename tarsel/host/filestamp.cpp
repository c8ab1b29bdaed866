#include "tarsel/host/filestamp.h"

#include <cerrno>
#include <vector>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/host/descriptor.h"
#include "tarsel/words/messages.h"

namespace {

constexpr size_t kBlock = 1 << 20;
constexpr size_t kDigits = 32;

// The engine leaves out zeros.
std::string md5(const void* bytes, size_t size) {
    if (size == 0) return std::string(kDigits, '0');
    std::string digits =
        QvUtil::md5Digest(Any(bytes, static_cast<int>(size)), static_cast<int>(kDigits)).asString("");
    digits.resize(kDigits, '0');
    return digits;
}

}  // namespace

std::optional<FileStamp> stampOf(const std::string& name) {
    struct stat status;
    if (stat(name.c_str(), &status) != 0 || !S_ISREG(status.st_mode)) return std::nullopt;
    return FileStamp{status.st_size, status.st_mtim.tv_sec * 1000000000LL + status.st_mtim.tv_nsec};
}

std::string digestOfFile(const std::string& name) {
    const Descriptor file(open(name.c_str(), O_RDONLY | O_CLOEXEC));
    if (!file) throw systemFailure(Msg::inputSystem, name, errno);
    std::vector<char> block(kBlock);
    std::string all;
    for (size_t filled = 0;;) {
        const ssize_t got = read(file.get(), block.data() + filled, kBlock - filled);
        if (got < 0 && errno == EINTR) continue;
        if (got < 0) throw systemFailure(Msg::inputSystem, name, errno);
        filled += static_cast<size_t>(got);
        if (got > 0 && filled < kBlock) continue;
        if (filled > 0) all += md5(block.data(), filled);
        if (got == 0) return digestOfText(all);
        filled = 0;
    }
}

std::string digestOfText(const std::string& text) { return md5(text.data(), text.size()); }
