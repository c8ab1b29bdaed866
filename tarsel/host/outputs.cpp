#include "tarsel/host/outputs.h"

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstdio>
#include <cstring>

#include <dirent.h>
#include <fcntl.h>
#include <stdlib.h>
#include <unistd.h>

#include "tarsel/words/failure.h"
#include "tarsel/words/messages.h"

namespace fs = std::filesystem;

namespace {

// Of the files in the hidden folder; whatever the final name holds, the engine handles this one.
const std::string kBase = "out";

fs::path folderOf(const fs::path& name) {
    return name.has_parent_path() ? name.parent_path() : fs::path(".");
}

// Beside `name`, without a "./" in front.
fs::path sibling(const fs::path& name, const std::string& filename) {
    return name.has_parent_path() ? name.parent_path() / filename : fs::path(filename);
}

[[noreturn]] void refuse(const fs::path& name, const std::string& why) {
    throw Failure(Exit::output, "can't write " + inQuotes(name.string()) + ": " + why);
}

bool sameFile(const fs::path& a, const fs::path& b) {
    std::error_code error;
    return fs::equivalent(a, b, error) && !error;
}

// The standard output may be a plain file that the shell has opened: it is written as a stream all the same.
bool takesStream(const fs::path& name) {
    std::error_code error;
    const auto status = fs::status(name, error);
    if (!fs::exists(status) || fs::is_directory(status)) return false;
    return !fs::is_regular_file(status) || name.string().rfind("/dev/", 0) == 0;
}

void checkFolder(const fs::path& name) {
    const fs::path folder = folderOf(name);
    std::error_code error;
    const auto status = fs::status(folder, error);
    const std::string quoted = inQuotes(folder.string());
    if (fs::is_directory(status)) {
        if (::access(folder.c_str(), W_OK | X_OK) != 0)
            refuse(name, "the folder " + quoted + " may not be written");
    } else if (fs::exists(status)) {
        refuse(name, quoted + " is no folder");
    } else if (status.type() == fs::file_type::none) {
        refuse(name, inLine(error.message()));
    } else {
        throw failure(Msg::outputFolderAbsent, {name.string(), folder.string()});
    }
}

struct Placed {
    fs::path hidden, final;
    bool exchanged;  // what stood there before has the hidden name
};

// In one step, so that there is never a moment without either file.
bool place(const fs::path& file, const fs::path& name, bool overwrite) {
    const auto rename = [&](unsigned flags) {
        return renameat2(AT_FDCWD, file.c_str(), AT_FDCWD, name.c_str(), flags) == 0;
    };
    if (overwrite && rename(RENAME_EXCHANGE)) return true;
    if (!overwrite || errno == ENOENT) {
        if (rename(RENAME_NOREPLACE)) return false;
        if (errno == EEXIST) throw failure(Msg::outputExists, {name.string()});
    }
    // Some file systems know none of the two.
    if (errno == EINVAL && rename(0)) return false;
    refuse(name, inLine(std::strerror(errno)));
}

// What the folder holds, which are plain files and links.
void removeAll(int folder) {
    alignas(dirent64) char entries[4096];
    lseek(folder, 0, SEEK_SET);
    for (ssize_t size; (size = getdents64(folder, entries, sizeof entries)) > 0;)
        for (ssize_t at = 0; at < size;) {
            const auto* entry = reinterpret_cast<const dirent64*>(entries + at);
            unlinkat(folder, entry->d_name, 0);  // fails for "." and ".."
            at += entry->d_reclen;
        }
}

// Those with a hidden folder; a job and its task file.
std::atomic<Outputs*> g_live[4];

void replaceLive(Outputs* former, Outputs* now) {
    for (auto& live : g_live) {
        Outputs* expected = former;
        if (live.compare_exchange_strong(expected, now)) return;
    }
}

void takeBack(const Placed& placed) {
    renameat2(AT_FDCWD, placed.final.c_str(), AT_FDCWD, placed.hidden.c_str(),
              placed.exchanged ? RENAME_EXCHANGE : 0);
}

}  // namespace

Outputs::Outputs(const std::string& output, const std::string& option, const std::vector<std::string>& inputs,
                 bool overwrite)
    : output_(output), inputs_(inputs), overwrite_(overwrite), device_(takesStream(output)) {
    std::error_code error;
    if (output.empty()) throw Failure(Exit::usage, option + ": the name of the output is empty");
    // The engine takes both slashes for separators.
    if (folderOf(output_).string().find('\\') != std::string::npos)
        refuse(output_, "a backslash can't stand in the name of the folder");
    if (fs::is_directory(output_, error)) refuse(output_, "this is a folder; give a file name in it");
    if (!device_) checkFolder(output_);
    checkFinal(output_);
}

Outputs::~Outputs() { discard(); }

void Outputs::checkFinal(const fs::path& name) const {
    for (const auto& input : inputs_)
        if (sameFile(input, name)) throw failure(Msg::outputIsInput, {name.string()});
    std::error_code error;
    const auto status = fs::symlink_status(name, error);
    if (error && status.type() == fs::file_type::none) refuse(name, inLine(error.message()));
    if (!overwrite_ && !device_ && fs::exists(status)) throw failure(Msg::outputExists, {name.string()});
    if (!device_ && fs::is_directory(name, error)) refuse(name, "a folder of this name is in the way");
}

void Outputs::checkNumbered(const std::string& extension) const {
    const std::string stem = output_.stem().string() + "#";
    for (const auto& entry : fs::directory_iterator(folderOf(output_))) {
        const std::string name = entry.path().filename().string();
        if (name.rfind(stem, 0) != 0 || entry.path().extension() != "." + extension) continue;
        const std::string number = entry.path().stem().string().substr(stem.size());
        if (!number.empty() && number.find_first_not_of("0123456789#") == std::string::npos)
            checkFinal(sibling(output_, name));
    }
}

std::string Outputs::withFinalNames(std::string text) const {
    const std::string hidden = (fs::path(folder_) / kBase).string();
    const std::string shown = (output_.parent_path() / output_.stem()).string();
    for (size_t at = 0; !folder_.empty() && (at = text.find(hidden, at)) != std::string::npos;
         at += shown.size())
        text.replace(at, hidden.size(), shown);
    return text;
}

std::string Outputs::hiddenName(const std::string& extension) const {
    return (folderOf(output_) / (kBase + "." + extension)).string();
}

std::string Outputs::begin(const std::string& extension) {
    // What is written to a device or a pipe goes straight there, by a link in a folder elsewhere.
    const fs::path where = device_ ? fs::temp_directory_path() : folderOf(output_);
    std::string pattern = (where / ".tarsel-XXXXXX").string();
    folder_ = std::move(pattern);
    {
        std::lock_guard guard(lock_);
        if (!mkdtemp(folder_.data())) refuse(output_, inLine(std::strerror(errno)));
        folderHandle_ = open(folder_.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
        if (folderHandle_ >= 0) replaceLive(nullptr, this);
    }
    if (folderHandle_ < 0) {
        const int error = errno;
        rmdir(folder_.c_str());
        refuse(output_, inLine(std::strerror(error)));
    }
    fs::path name = fs::path(folder_) / kBase;
    name += "." + extension;
    if (device_) {
        std::error_code error;
        fs::create_symlink(fs::absolute(output_), name, error);
        if (error) refuse(output_, inLine(error.message()));
    }
    return name.string();
}

std::string Outputs::finalName(const fs::path& written, const std::string& from) const {
    const std::string rest = written.filename().string().substr(kBase.size());
    fs::path name = output_.stem();
    name += rest == "." + from ? output_.extension().string() : rest;
    return (output_.has_parent_path() ? output_.parent_path() / name : name).string();
}

std::vector<fs::path> Outputs::written() const {
    std::vector<fs::path> files;
    if (device_ || folder_.empty()) return files;
    // The forms that report by a code end the program when memory is short.
    try {
        for (const auto& entry : fs::directory_iterator(folder_)) files.push_back(entry.path());
    } catch (const fs::filesystem_error& failure) {
        refuse(output_, inLine(failure.code().message()));
    }
    std::sort(files.begin(), files.end());
    return files;
}

std::vector<std::string> Outputs::commit(const std::string& from) {
    if (device_) {
        discard();
        return {output_.string()};
    }
    std::vector<std::string> names;
    {
        std::lock_guard guard(lock_);
        const std::vector<fs::path> files = written();
        std::vector<Placed> placed;
        try {
            for (const auto& file : files) {
                const fs::path name = finalName(file, from);
                checkFinal(name);
                placed.push_back({file, name, place(file, name, overwrite_)});
                names.push_back(name.string());
            }
        } catch (...) {
            for (auto p = placed.rbegin(); p != placed.rend(); ++p) takeBack(*p);
            throw;
        }
    }
    discard();
    const auto first = std::find(names.begin(), names.end(), output_.string());
    if (first != names.end()) std::rotate(names.begin(), first, first + 1);
    return names;
}

void Outputs::discard() {
    std::lock_guard guard(lock_);
    if (folderHandle_ < 0) return;
    replaceLive(this, nullptr);
    remove();
}

void Outputs::remove() {
    removeAll(folderHandle_);
    close(folderHandle_);
    folderHandle_ = -1;
    rmdir(folder_.c_str());
}

bool Outputs::abandonAll() {
    bool any = false;
    for (auto& live : g_live) {
        Outputs* outputs = live.exchange(nullptr);
        if (!outputs) continue;
        outputs->remove();
        any = true;
    }
    return any;
}
