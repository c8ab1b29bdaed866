#include <dlfcn.h>

#include "core/arch/platform.h"

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

void* open(const std::string& name, std::string& error) {
    void* const library = dlopen(name.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (!library) {
        const char* const reason = dlerror();
        error = reason ? reason : "unknown reason";
    }
    return library;
}

// Loads dependencies from `folder` until `name` loads or the loader complains of something else. They stay
// loaded for as long as `name` needs them. The depth bounds dependencies that need each other.
void* openWithFolder(const std::string& name, const std::string& folder, std::string& error, int depth) {
    std::vector<void*> dependencies;
    void* library = open(name, error);
    for (std::string last; !library && depth > 0;) {
        const std::string missing = missingDependency(error);
        if (missing.empty() || missing == last) break;
        last = missing;
        std::string reason;
        void* const dependency = openWithFolder(folder + missing, folder, reason, depth - 1);
        if (!dependency) break;
        dependencies.push_back(dependency);
        library = open(name, error);
    }
    for (void* dependency : dependencies) dlclose(dependency);
    return library;
}

}  // namespace

void* QvPlatform::loadLibrary(const char* name, std::string& error) {
    // Without a separator the loader would search its own folders for the name.
    const std::string file = std::string_view(name).find('/') == std::string_view::npos
                                 ? std::string("./") + name
                                 : std::string(name);
    constexpr int deepest = 16;
    return openWithFolder(file, folderOf(file), error, deepest);
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
