#include "tarsel/host/outputs/streamoutput.h"

#include <cerrno>
#include <charconv>
#include <filesystem>

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include "tarsel/host/descriptor.h"
#include "tarsel/words/messages.h"

namespace fs = std::filesystem;

namespace {

constexpr const char* kStandard = "/dev/stdout";
constexpr std::string_view kDescriptors[] = {"/dev/fd/", "/proc/self/fd/"};

bool isNullDevice(const struct stat& facts) {
    return S_ISCHR(facts.st_mode) && major(facts.st_rdev) == 1 && minor(facts.st_rdev) == 3;
}

bool sameFile(const std::string& first, const std::string& second) {
    std::error_code error;
    return fs::is_regular_file(second, error) && fs::equivalent(first, second, error);
}

// The number in a name of one of this process's descriptors; -1 for other names.
int descriptorOf(const std::string& name) {
    if (name == kStandard) return STDOUT_FILENO;
    if (name == "/dev/stderr") return STDERR_FILENO;
    for (const std::string_view start : kDescriptors) {
        if (name.rfind(start, 0) != 0) continue;
        int number = -1;
        const char* const last = name.data() + name.size();
        const auto [end, error] = std::from_chars(name.data() + start.size(), last, number);
        if (error == std::errc() && end == last) return number;
    }
    return -1;
}

}  // namespace

bool StreamOutput::namesDescriptor(const std::string& name) {
    for (const std::string_view start : kDescriptors)
        if (name.rfind(start, 0) == 0) return true;
    return name == kStandard || name == "/dev/stderr" || name == "/dev/stdin";
}

std::unique_ptr<StreamOutput> StreamOutput::find(const std::string& output,
                                                 const std::vector<std::string>& inputs) {
    StreamOutput found;
    found.name_ = output;
    found.standard_ = output == "-" || output == kStandard || output == "/dev/fd/1";
    struct stat facts {};
    const std::string name = found.engineName();
    if (found.standard_) {
        // One that was closed is opened the wrong way round when the program starts.
        const int flags = fcntl(STDOUT_FILENO, F_GETFL);
        if (flags < 0 || (flags & O_ACCMODE) == O_RDONLY || fstat(STDOUT_FILENO, &facts) != 0)
            throw failure(Msg::streamClosed, {output});
        if (isatty(STDOUT_FILENO)) throw failure(Msg::streamToTerminal, {output});
    } else if (stat(name.c_str(), &facts) != 0 || S_ISDIR(facts.st_mode) ||
               (S_ISREG(facts.st_mode) && !namesDescriptor(name))) {
        return nullptr;
    }
    if (S_ISSOCK(facts.st_mode) && !namesDescriptor(name)) throw failure(Msg::streamIsSocket, {output});
    for (const auto& input : inputs)
        if (sameFile(input, name)) throw failure(Msg::outputIsInput, {output});
    found.discards_ = isNullDevice(facts);
    return std::make_unique<StreamOutput>(found);
}

std::string StreamOutput::engineName() const { return name_ == "-" ? kStandard : name_; }

std::string StreamOutput::place() const {
    std::error_code error;
    return fs::weakly_canonical(engineName(), error).string();
}

int StreamOutput::write(std::string_view bytes) const {
    // What the shell has opened is written where it stands.
    const int own = descriptorOf(engineName());
    const Descriptor output(own >= 0 ? fcntl(own, F_DUPFD_CLOEXEC, 0)
                                     : open(name_.c_str(), O_WRONLY | O_NOCTTY | O_CLOEXEC));
    if (!output) return errno;
    while (!bytes.empty()) {
        const ssize_t taken = ::write(output.get(), bytes.data(), bytes.size());
        if (taken < 0 && errno == EINTR) continue;
        if (taken <= 0) return taken < 0 ? errno : ENOSPC;
        bytes.remove_prefix(static_cast<size_t>(taken));
    }
    return 0;
}

std::string StreamOutput::withUserName(std::string text) const {
    const std::string engine = engineName();
    if (engine == name_) return text;
    for (size_t at = 0; (at = text.find(engine, at)) != std::string::npos; at += name_.size())
        text.replace(at, engine.size(), name_);
    return text;
}
