#include "tarsel/host/outputs/outputs.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <set>

#include <unistd.h>

#include "tarsel/host/outputs/attributes.h"
#include "tarsel/host/outputs/foldercalls.h"
#include "tarsel/host/outputs/recovery.h"
#include "tarsel/host/outputs/streamoutput.h"
#include "tarsel/words/failure.h"
#include "tarsel/words/messages.h"

namespace fs = std::filesystem;

namespace {

// Of the files in the hidden folder; whatever the final name holds, the engine handles this one.
const std::string kBase = "out";
// What can follow it.
constexpr const char* kNameLetters = "#.0123456789abcdefghijklmnopqrstuvwxyz";

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

// A redirected stream may be a plain file that the shell has opened: it is written as a stream all the same.
bool takesStream(const fs::path& name) {
    std::error_code error;
    const auto status = fs::status(name, error);
    if (!fs::exists(status) || fs::is_directory(status)) return false;
    return !fs::is_regular_file(status) || StreamOutput::namesDescriptor(name.string());
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

// Where the links lead to that `name` is, also if nothing is there yet.
fs::path followed(fs::path name) {
    constexpr int most = 40;  // as the system follows
    std::error_code error;
    for (int i = 0; i < most && fs::is_symlink(fs::symlink_status(name, error)); ++i) {
        const fs::path to = fs::read_symlink(name, error);
        if (error) break;
        name = to.is_absolute() ? to : folderOf(name) / to;
    }
    return name;
}

// What follows the stem of a name, "#7.png" as "##.png": numbers make no other set.
std::string shapeOf(std::string_view name) {
    std::string shape;
    for (size_t i = 0; i < name.size(); ++i) {
        shape += name[i];
        if (name[i] != '#' || i + 1 >= name.size() || name[i + 1] < '0' || name[i + 1] > '9') continue;
        shape += '#';
        while (i + 1 < name.size() && name[i + 1] >= '0' && name[i + 1] <= '9') ++i;
    }
    return shape;
}

// Those with a hidden folder: a job, its task file, and what its filters write.
std::atomic<Outputs*> g_live[16];

void replaceLive(Outputs* former, Outputs* now) {
    for (auto& live : g_live) {
        Outputs* expected = former;
        if (live.compare_exchange_strong(expected, now)) return;
    }
}

}  // namespace

Outputs::Outputs(const std::string& output, const std::string& option, const std::vector<std::string>& inputs,
                 const OutputPolicy& policy)
    : output_(output), inputs_(inputs), policy_(policy), device_(takesStream(output)) {
    std::error_code error;
    if (output.empty()) throw Failure(Exit::usage, option + ": the name of the output is empty");
    // The engine takes both slashes for separators.
    if (folderOf(output_).string().find('\\') != std::string::npos)
        refuse(output_, "a backslash can't stand in the name of the folder");
    if (fs::is_directory(output_, error)) refuse(output_, "this is a folder; give a file name in it");
    if (!device_) {
        target_ = followed(output_);
        checkFolder(output_);
        putInOrder(folderOf(output_));
    }
    checkFinal(output_);
    if (device_ || target_ == output_) return;
    checkFolder(target_);
    if (folderOf(target_) != folderOf(output_)) putInOrder(folderOf(target_));
}

void Outputs::putInOrder(const fs::path& folder) const {
    if (!policy_.recover) return;
    const auto found = recoverPlace(folder.string(), {.stale = policy_.stale, .sync = policy_.sync});
    if (policy_.quiet) return;
    for (const auto& line : recoveryLines(folder.string(), found, true))
        std::fprintf(stderr, "tarsel: %s\n", line.c_str());
}

Outputs::~Outputs() { discard(); }

void Outputs::checkFinal(const fs::path& name) const {
    for (const auto& input : inputs_)
        if (sameFile(input, name)) throw failure(Msg::outputIsInput, {name.string()});
    std::error_code error;
    const auto status = fs::symlink_status(name, error);
    if (error && status.type() == fs::file_type::none) refuse(name, inLine(error.message()));
    if (!policy_.overwrite && !device_ && fs::exists(status))
        throw failure(Msg::outputExists, {name.string()});
    if (!device_ && fs::is_directory(name, error)) refuse(name, "a folder of this name is in the way");
}

void Outputs::number(const NumberedName& name) {
    numbered_ = name;
    expectSet();
}

void Outputs::checkNumbered(const std::string& extension) const {
    if (numbered_) {
        for (const auto& entry : fs::directory_iterator(folderOf(output_)))
            if (const std::string name = entry.path().filename().string(); numbered_->matches(name))
                checkFinal(sibling(output_, name));
        return;
    }
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
    const std::string hidden = (fs::path(work_.path()) / kBase).string();
    if (numbered_ && !work_.path().empty()) {
        for (size_t at = 0; (at = text.find(hidden, at)) != std::string::npos; ++at) {
            const size_t end =
                std::min(text.find_first_not_of(kNameLetters, at + hidden.size()), text.size());
            text.replace(at, end - at, finalName(text.substr(at, end - at), extension_));
        }
        return text;
    }
    const std::string shown = (output_.parent_path() / output_.stem()).string();
    for (size_t at = 0; !work_.path().empty() && (at = text.find(hidden, at)) != std::string::npos;
         at += shown.size())
        text.replace(at, hidden.size(), shown);
    return text;
}

std::string Outputs::hiddenName(const std::string& extension) const {
    return (folderOf(output_) / (kBase + "." + extension)).string();
}

std::string Outputs::begin(const std::string& extension) {
    extension_ = extension;
    // What is written to a device or a pipe goes straight there, by a link in a folder elsewhere.
    const fs::path where = device_ ? fs::temp_directory_path() : folderOf(set_ ? output_ : target_);
    // Nothing of a user's lies there, so there is nothing to say of it.
    if (device_ && policy_.recover) recoverPlace(where.string(), {.stale = policy_.stale, .sync = false});
    {
        std::lock_guard guard(lock_);
        if (const int error = work_.make(where.string())) refuse(output_, inLine(std::strerror(error)));
        replaceLive(nullptr, this);
    }
    fs::path name = fs::path(work_.path()) / kBase;
    if (!extension.empty()) name += "." + extension;
    if (device_) {
        std::error_code error;
        fs::create_symlink(fs::absolute(output_), name, error);
        if (error) refuse(output_, inLine(error.message()));
    }
    return name.string();
}

// `rest`: what the engine put after the base, as "#0007.png", "#01.wav" or ".wav".
std::string Outputs::numberedName(const std::string& rest, const std::string& from) const {
    const std::string own = "." + from;
    const std::string extension = rest.substr(std::min(rest.rfind('.'), rest.size()));
    const bool pictures = from == "png";
    if (pictures && extension != own) return numbered_->plain(rest);
    const long long number = rest[0] == '#' ? std::atoll(rest.c_str() + 1) : 0;
    return numbered_->at(number, extension == own ? "" : extension);
}

std::string Outputs::finalName(const fs::path& written, const std::string& from) const {
    const std::string rest = written.filename().string().substr(kBase.size());
    if (numbered_ && !rest.empty()) return sibling(output_, numberedName(rest, from)).string();
    // What was begun without an extension keeps the whole name.
    fs::path name = rest.empty() ? output_.filename() : output_.stem();
    name += rest == "." + from ? output_.extension().string() : rest;
    return (output_.has_parent_path() ? output_.parent_path() / name : name).string();
}

std::vector<fs::path> Outputs::written() const {
    std::vector<fs::path> files;
    if (device_ || !work_) return files;
    std::vector<std::string> names;
    if (const int error = listFolder(work_.handle(), names)) refuse(output_, inLine(std::strerror(error)));
    if (isRemoved(work_.handle())) throw failure(Msg::outputFolderGone, {output_.string()});
    for (const auto& name : names)
        if (name.rfind(kBase, 0) == 0) files.push_back(fs::path(work_.path()) / name);
    std::sort(files.begin(), files.end());
    return files;
}

bool Outputs::mayGo(const fs::path& name) const {
    std::error_code error;
    return !fs::is_directory(fs::symlink_status(name, error)) &&
           std::none_of(inputs_.begin(), inputs_.end(),
                        [&](const auto& input) { return sameFile(input, name); });
}

// The same for numbered names: all that have a number of this form, and next to pictures their sound.
std::vector<std::string> Outputs::formerNumbers(const std::vector<Manifest::Row>& fresh) const {
    std::set<std::string> names, extensions = {""};
    for (const auto& row : fresh) {
        if (entryExists(work_.place(), row.name.c_str())) names.insert(row.name);
        const std::string extension = fs::path(row.name).extension().string();
        if (numbered_->matches(row.name, extension)) extensions.insert(extension);
    }
    std::vector<std::string> all;
    if (const int error = listFolder(work_.place(), all))
        throw failure(Msg::outputNotPlaced, {output_.string(), std::strerror(error)});
    bool hadPictures = false;
    std::vector<std::string> sound;
    const std::string stem = numbered_->plain("");
    const auto isSound = [&](const std::string& name) {
        const std::string shape = name.rfind(stem, 0) == 0 ? shapeOf(name.substr(stem.size())) : "";
        return shape == ".wav" || shape == "##.wav";
    };
    const auto isOurs = [&](const std::string& name) {
        return std::any_of(extensions.begin(), extensions.end(),
                           [&](const auto& extension) { return numbered_->matches(name, extension); });
    };
    for (const auto& name : all) {
        if (!mayGo(sibling(output_, name))) continue;
        if (isSound(name)) sound.push_back(name);
        if (!isOurs(name)) continue;
        names.insert(name);
        hadPictures = hadPictures || extension_ == "png";
    }
    if (hadPictures) names.insert(sound.begin(), sound.end());
    return {names.begin(), names.end()};
}

// What an earlier run of the same output has left: files whose names differ in nothing but their numbers,
// and next to numbered pictures their sound.
std::vector<std::string> Outputs::formerSet(const std::vector<Manifest::Row>& fresh) const {
    if (numbered_) return formerNumbers(fresh);
    const std::string stem = output_.stem().string();
    const auto ending = [&](const std::string& name) { return shapeOf(name.substr(stem.size())); };
    const auto isPicture = [](const std::string& shape) { return shape.ends_with("##.png"); };
    std::set<std::string> shapes, names;
    for (const auto& row : fresh) {
        if (entryExists(work_.place(), row.name.c_str())) names.insert(row.name);
        if (row.name.rfind(stem, 0) == 0 && ending(row.name).find("##") == 0) shapes.insert(ending(row.name));
    }
    if (shapes.empty()) return {names.begin(), names.end()};
    const bool pictures = std::any_of(shapes.begin(), shapes.end(), isPicture);
    bool hadPictures = false;
    std::vector<std::string> all, sound;
    if (const int error = listFolder(work_.place(), all))
        throw failure(Msg::outputNotPlaced, {output_.string(), std::strerror(error)});
    for (const auto& name : all) {
        if (name.rfind(stem, 0) != 0) continue;
        const std::string shape = ending(name);
        const bool isSound = pictures && (shape == ".wav" || shape == "##.wav");
        if ((!isSound && shapes.count(shape) == 0) || !mayGo(sibling(output_, name))) continue;
        if (isSound)
            sound.push_back(name);
        else
            names.insert(name);
        hadPictures = hadPictures || isPicture(shape);
    }
    // Sound alone may be anything.
    if (hadPictures) names.insert(sound.begin(), sound.end());
    return {names.begin(), names.end()};
}

Manifest Outputs::plan(const std::vector<fs::path>& files, const std::string& from) const {
    Manifest set;
    for (const auto& file : files) {
        const fs::path name = finalName(file, from);
        checkFinal(name);
        const bool followsLink = !set_ && name == output_;
        set.fresh.push_back({file.filename().string(), (followsLink ? target_ : name).filename().string()});
    }
    if (!policy_.overwrite) return set;
    for (const auto& name : formerSet(set.fresh))
        set.old.push_back({"old-" + std::to_string(set.old.size()), name});
    for (const auto& row : set.fresh)
        if (const int error =
                keepAttributes(work_.handle(), row.hidden.c_str(), work_.place(), row.name.c_str()))
            notPlaced({error, row.name, false});
    return set;
}

void Outputs::notPlaced(const PlaceResult& result) const {
    const std::string name =
        (result.name.empty() ? output_ : sibling(output_, std::string(result.name))).string();
    const std::string reason = std::strerror(result.error);
    if (!result.torn && result.error == EEXIST) throw failure(Msg::outputExists, {name});
    if (!result.torn) throw failure(Msg::outputNotPlaced, {name, reason});
    throw failure(Msg::outputTorn, {name, reason, folderOf(set_ ? output_ : target_).string()});
}

// Files are brought to the disk before the lock is taken: a second signal must not wait for that.
void Outputs::place(const Manifest& set) {
    const bool one = set.fresh.size() == 1 &&
                     (set.old.empty() || (set.old.size() == 1 && set.old[0].name == set.fresh[0].name));
    SetPlacement placement(work_.handle(), work_.place(), set, policy_.sync);
    PlaceResult result;
    if (!one)
        result = placement.prepare();
    else if (policy_.sync)
        result.error = syncFile(work_.handle(), set.fresh[0].hidden.c_str());
    if (result.error != 0)
        throw failure(Msg::outputNotSynced, {output_.string(), std::strerror(result.error)});
    {
        std::lock_guard guard(lock_);
        moving_ = true;
        result = one ? placeOne(work_.handle(), work_.place(), set.fresh[0], policy_.overwrite, policy_.sync)
                     : placement.run();
        if (result.torn) {
            replaceLive(this, nullptr);
            work_.leave();
        }
        moving_ = false;
        placed_ = result.error == 0;
    }
    if (result.error != 0) notPlaced(result);
}

std::vector<std::string> Outputs::commit(const std::string& from) {
    if (device_) {
        discard();
        return {output_.string()};
    }
    const std::vector<fs::path> files = written();
    std::vector<std::string> names;
    for (const auto& file : files) names.push_back(finalName(file, from));
    if (!files.empty()) place(plan(files, from));
    discard();
    const auto first = std::find(names.begin(), names.end(), output_.string());
    if (first != names.end()) std::rotate(names.begin(), first, first + 1);
    return names;
}

void Outputs::discard() {
    std::lock_guard guard(lock_);
    if (!work_) return;
    replaceLive(this, nullptr);
    work_.remove();
}

bool Outputs::abandonAll() {
    bool any = false;
    for (auto& live : g_live) {
        Outputs* outputs = live.exchange(nullptr);
        if (!outputs || outputs->moving_) continue;
        outputs->work_.remove();
        any = true;
    }
    return any;
}
