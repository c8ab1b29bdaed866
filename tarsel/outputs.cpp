#include "outputs.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <regex>

#include <stdlib.h>
#include <unistd.h>

#include "failure.h"

namespace fs = std::filesystem;

namespace {

fs::path folderOf(const fs::path& name) {
    return name.has_parent_path() ? name.parent_path() : fs::path(".");
}

[[noreturn]] void refuse(const fs::path& name, const std::string& why) {
    throw Failure(Exit::output, "can't write " + inQuotes(name.string()) + ": " + why);
}

bool sameFile(const fs::path& a, const fs::path& b) {
    std::error_code error;
    return fs::equivalent(a, b, error) && !error;
}

}  // namespace

Outputs::Outputs(const std::string& output, const std::vector<std::string>& inputs, bool overwrite)
    : output_(output), inputs_(inputs), overwrite_(overwrite) {
    std::error_code error;
    if (output.empty()) throw Failure(Exit::usage, "-o: the name of the output is empty");
    if (fs::is_directory(output_, error)) refuse(output_, "this is a folder; give a file name in it");
    const fs::path folder = folderOf(output_);
    if (!fs::is_directory(folder, error))
        refuse(output_, "the folder " + inQuotes(folder.string()) + " does not exist");
    if (::access(folder.c_str(), W_OK | X_OK) != 0)
        refuse(output_, "the folder " + inQuotes(folder.string()) + " may not be written");
    checkFinal(output_);
}

Outputs::~Outputs() { discard(); }

void Outputs::checkFinal(const fs::path& name) const {
    for (const auto& input : inputs_)
        if (sameFile(input, name)) refuse(name, "it is also an input");
    std::error_code error;
    if (!overwrite_ && fs::exists(fs::symlink_status(name, error)))
        refuse(name, "it exists; use -y to overwrite it");
}

void Outputs::checkNumbered(const std::string& extension) const {
    const std::string stem = output_.stem().string() + "#";
    std::error_code error;
    for (const auto& entry : fs::directory_iterator(folderOf(output_), error)) {
        const std::string name = entry.path().filename().string();
        if (name.rfind(stem, 0) != 0 || entry.path().extension() != "." + extension) continue;
        const std::string number = entry.path().stem().string().substr(stem.size());
        if (!number.empty() && number.find_first_not_of("0123456789#") == std::string::npos)
            checkFinal(entry.path());
    }
}

bool Outputs::isDevice() const {
    std::error_code error;
    const auto status = fs::status(output_, error);
    return fs::exists(status) && !fs::is_regular_file(status);
}

std::string Outputs::withFinalNames(std::string text) const {
    const std::string hidden = folder_.string() + "/";
    const std::string shown = output_.has_parent_path() ? output_.parent_path().string() + "/" : "";
    for (size_t at = 0; !folder_.empty() && (at = text.find(hidden, at)) != std::string::npos;
         at += shown.size())
        text.replace(at, hidden.size(), shown);
    return text;
}

std::string Outputs::begin(const std::string& extension) {
    // What is written to a device or a pipe goes straight there, by a link in a folder elsewhere.
    const fs::path where = isDevice() ? fs::temp_directory_path() : folderOf(output_);
    std::string pattern = (where / ".tarsel-XXXXXX").string();
    if (!mkdtemp(pattern.data())) refuse(output_, std::strerror(errno));
    folder_ = pattern;
    fs::path name = folder_ / output_.stem();
    name += "." + extension;
    if (isDevice()) {
        std::error_code error;
        fs::create_symlink(fs::absolute(output_), name, error);
        if (error) refuse(output_, error.message());
    }
    return name.string();
}

std::string Outputs::finalName(const fs::path& written, const std::string& from) const {
    fs::path name = written.filename();
    if (name.extension() == "." + from) name.replace_extension(output_.extension());
    return (output_.has_parent_path() ? output_.parent_path() / name : name).string();
}

std::vector<std::string> Outputs::commit(const std::string& from) {
    std::vector<fs::path> written;
    std::error_code error;
    for (const auto& entry : fs::directory_iterator(folder_, error))
        if (!fs::is_symlink(entry.symlink_status())) written.push_back(entry.path());
    if (error) refuse(output_, error.message());
    std::sort(written.begin(), written.end());
    for (const auto& file : written) checkFinal(finalName(file, from));
    std::vector<std::string> names;
    for (const auto& file : written) {
        const std::string name = finalName(file, from);
        fs::rename(file, name, error);
        if (error) {
            for (const auto& done : names) fs::remove(done, error);
            refuse(name, error.message());
        }
        names.push_back(name);
    }
    discard();
    return names;
}

void Outputs::discard() {
    if (folder_.empty()) return;
    std::error_code ignored;
    fs::remove_all(folder_, ignored);
}
