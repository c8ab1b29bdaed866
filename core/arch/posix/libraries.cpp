#include <cxxabi.h>
#include <dlfcn.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "core/arch/platform.h"
#include "core/arch/posix/elffile_p.h"
#include "core/arch/posix/trustedpath_p.h"

namespace {

std::string folderOf(const std::string& name) {
    const std::size_t slash = name.rfind('/');
    return slash == std::string::npos ? "./" : name.substr(0, slash + 1);
}

// The loader names the dependency that it did not find at the start of its message, up to a colon.
std::string missingDependency(const std::string& message) {
    if (message.find("cannot open shared object file") == std::string::npos) return "";
    const std::string library = message.substr(0, message.find(':'));
    return library.find('/') == std::string::npos ? library : "";
}

// What stands in `message` after `before` and in front of the next one of `ends`; "" without `before`.
std::string wordAfter(const std::string& message, std::string_view before, std::string_view ends) {
    const std::size_t at = message.find(before);
    if (at == std::string::npos) return "";
    const std::size_t begin = at + before.size();
    return message.substr(begin, message.find_first_of(ends, begin) - begin);
}

// The name of a symbol as its source has it. C++ types can make it endless, so it is cut.
std::string readable(const std::string& symbol) {
    constexpr std::size_t mostMangled = 1000, mostShown = 60;
    int status = -1;
    char* const text = symbol.size() > mostMangled
                           ? nullptr
                           : abi::__cxa_demangle(symbol.c_str(), nullptr, nullptr, &status);
    std::string name = status == 0 && text ? text : symbol;
    std::free(text);
    if (name.size() > mostShown) name = name.substr(0, mostShown) + "...";
    return name;
}

// What the loader says when it refuses a file: of a library that is not there, of a symbol that no library
// has, or of a version of one. Else its message without the file's own name, which it begins with.
QvLibrary refusal(const std::string& message, const std::string& name) {
    if (const std::string missing = missingDependency(message); !missing.empty())
        return {nullptr, QvLibraryFault::unresolved,
                "needs the library '" + missing + "', which is not there"};
    if (const std::string symbol = wordAfter(message, "undefined symbol: ", " ,\t"); !symbol.empty())
        return {nullptr, QvLibraryFault::foreign,
                "needs '" + readable(symbol) + "', which no library here has"};
    if (const std::string version = wordAfter(message, ": version `", "'"); !version.empty())
        return {nullptr, QvLibraryFault::foreign,
                "needs the version '" + version + "' of a library, which is not here"};
    const bool named = message.starts_with(name + ": ");
    return {nullptr, QvLibraryFault::unresolved,
            "can't be loaded: " + (named ? message.substr(name.size() + 2) : message)};
}

// A file for reading; a name that leads to a pipe or a device does not block.
class File {
  public:
    explicit File(const std::string& name)
        : descriptor_(::open(name.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC)) {}
    File(const File&) = delete;
    File& operator=(const File&) = delete;
    ~File() {
        if (descriptor_ >= 0) close(descriptor_);
    }
    int descriptor() const { return descriptor_; }
    // False if it is not open, or is not a regular file.
    bool size(std::uint64_t& bytes) const {
        struct stat facts {};
        if (fstat(descriptor_, &facts) != 0 || !S_ISREG(facts.st_mode)) return false;
        bytes = static_cast<std::uint64_t>(facts.st_size);
        return true;
    }

  private:
    const int descriptor_;
};

QvLibrary checkContents(const std::string& name) {
    const File file(name);
    if (file.descriptor() < 0)
        return {nullptr, QvLibraryFault::unreadable, std::string("can't be opened: ") + std::strerror(errno)};
    std::uint64_t size = 0;
    const std::string fault = file.size(size) ? qvElfFault(file.descriptor(), size) : "is not a regular file";
    return {nullptr, fault.empty() ? QvLibraryFault::none : QvLibraryFault::invalid, fault};
}

// A library that lets an exception out of its start ends the program: the loader would keep its lock, and the
// next library would wait for ever. dlopen says that it throws nothing, so that a compiler may leave the
// guard out where it is called by its name.
void* start(const char* name) noexcept {
    void* (*volatile const load)(const char*, int) = dlopen;
    return load(name, RTLD_NOW | RTLD_LOCAL);
}

class Loader {
  public:
    Loader(QvLibraryTrust trust, const std::string& name) : trust_(trust) {
        folders_.push_back(folderOf(name));
    }

    // The file is checked and then loaded by its name, without links, right after. Loading what the check has
    // opened, as /proc/self/fd/N, would close the moment in between, but the library would no longer know its
    // own folder ($ORIGIN), nor the loader that it is loaded already. That moment is open only to this user
    // and root, which could change the file beforehand as well.
    QvLibrary load(const std::string& name, int depth) {
        const QvFoundFile found = qvFindLibrary(name, trust_);
        if (found.name.empty()) return {nullptr, found.fault, found.reason};
        QvLibrary result = checkContents(found.name);
        if (result.fault != QvLibraryFault::none) return result;
        if (folders_.size() == 1) folders_.push_back(folderOf(found.name));
        return open(found.name, depth);
    }

  private:
    // Loads dependencies from the library's folder until it loads or the loader complains of something else.
    // They stay loaded for as long as it needs them. The depth bounds dependencies that need each other.
    QvLibrary open(const std::string& name, int depth) {
        std::vector<void*> dependencies;
        QvLibrary result;
        for (std::string last;;) {
            result.handle = start(name.c_str());
            if (result.handle) break;
            const char* const message = dlerror();
            const std::string missing = missingDependency(message ? message : "");
            result = refusal(message ? message : "unknown reason", name);
            if (missing.empty() || missing == last || depth == 0) break;
            last = missing;
            void* const dependency = loadDependency(missing, depth - 1, result.reason);
            if (!dependency) break;
            dependencies.push_back(dependency);
        }
        for (void* dependency : dependencies) dlclose(dependency);
        if (!result.handle) return result;
        return {result.handle, QvLibraryFault::none, ""};
    }

    // From the folder of the name that was given, or of the file that it leads to.
    void* loadDependency(const std::string& file, int depth, std::string& reason) {
        for (const std::string& folder : folders_) {
            const QvLibrary dependency = load(folder + file, depth);
            if (dependency.handle) return dependency.handle;
            if (dependency.fault == QvLibraryFault::unreadable) continue;
            reason = "needs the library '" + file + "', which " + dependency.reason;
            break;
        }
        return nullptr;
    }

    const QvLibraryTrust trust_;
    std::vector<std::string> folders_;
};

}  // namespace

QvLibrary QvPlatform::loadLibrary(const char* name, QvLibraryTrust trust) {
    constexpr int deepest = 16;
    return Loader(trust, name).load(name, deepest);
}

bool QvPlatform::libraryNumber(const char* name, const char* symbol, std::uint32_t& value) {
    const File file(name);
    std::uint64_t size = 0;
    if (!file.size(size)) return false;
    const std::optional<std::uint32_t> number = qvElfNumber(file.descriptor(), size, symbol);
    if (number) value = *number;
    return number.has_value();
}

void* QvPlatform::findSymbol(void* library, const char* symbol) { return dlsym(library, symbol); }

void QvPlatform::unloadLibrary(void* library) { dlclose(library); }

std::string QvPlatform::coreLibraryPath() {
    Dl_info info{};
    if (!dladdr(reinterpret_cast<const void*>(&qv_platform), &info) || !info.dli_fname) return "";
    const std::string name = info.dli_fname;
    if (name.empty() || name.front() == '/') return name;
    return currentFolder() + "/" + name;
}
