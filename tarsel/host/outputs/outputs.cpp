#include "tarsel/host/outputs/outputs.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <set>

#include <unistd.h>

#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/host/outputs/attributes.h"
#include "tarsel/host/outputs/foldercalls.h"
#include "tarsel/host/outputs/recovery.h"
#include "tarsel/words/failure.h"
#include "tarsel/words/messages.h"

namespace fs = std::filesystem;

namespace {

// The stem that files have in the hidden folder. The engine sees only this name, whatever characters the
// final one has. If several outputs share a folder, a number precedes it for all but the first.
const std::string kBase = "out";
// The characters that can follow it.
constexpr const char* kNameLetters = "#.0123456789abcdefghijklmnopqrstuvwxyz";

fs::path folderOf(const fs::path& name) {
    return name.has_parent_path() ? name.parent_path() : fs::path(".");
}

// A file in the folder of `name`, without a "./" in front.
fs::path sibling(const fs::path& name, const std::string& filename) {
    return name.has_parent_path() ? name.parent_path() / filename : fs::path(filename);
}

fs::path inFolder(const std::string& folder, const std::string& filename) {
    return folder == "." ? fs::path(filename) : fs::path(folder) / filename;
}

[[noreturn]] void refuse(Msg id, const fs::path& name) { throw failure(id, {name.string()}); }

[[noreturn]] void refuse(const fs::path& name, int error) {
    throw systemFailure(Msg::outputSystem, name.string(), error);
}

bool sameFile(const fs::path& a, const fs::path& b) {
    std::error_code error;
    return fs::equivalent(a, b, error) && !error;
}

void checkFolder(const fs::path& name) {
    const fs::path folder = folderOf(name);
    std::error_code error;
    const auto status = fs::status(folder, error);
    if (fs::is_directory(status)) {
        if (::access(folder.c_str(), W_OK | X_OK) != 0)
            throw failure(Msg::outputFolderClosed, {name.string(), folder.string()});
    } else if (fs::exists(status)) {
        throw failure(Msg::outputFolderNone, {name.string(), folder.string()});
    } else if (status.type() == fs::file_type::none) {
        refuse(name, error.value());
    } else {
        throw failure(Msg::outputFolderAbsent, {name.string(), folder.string()});
    }
}

// The name to which a symbolic link leads in the end, which need not exist.
fs::path followed(fs::path name) {
    constexpr int most = 40;  // links, the limit of the system
    std::error_code error;
    for (int i = 0; i < most && fs::is_symlink(fs::symlink_status(name, error)); ++i) {
        const fs::path to = fs::read_symlink(name, error);
        if (error) break;
        name = to.is_absolute() ? to : folderOf(name) / to;
    }
    return name;
}

// The failure that says `name` exists and is not written.
Failure existing(const fs::path& name, const OutputPolicy& policy) {
    if (policy.keep && policy.quiet) return Failure(Exit::done, "");
    return failure(policy.keep ? Msg::outputKept : Msg::outputExists, {name.string()});
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

// The number in "card#0007.png" after "card#"; -1 for another name or more than 18 digits.
long long numberIn(const std::string& name, const std::string& start, const std::string& extension) {
    const size_t end = name.size() - std::min(name.size(), extension.size());
    if (name.rfind(start, 0) != 0 || end <= start.size() || name.substr(end) != extension) return -1;
    const std::string digits = name.substr(start.size(), end - start.size());
    if (digits.size() > 18 || digits.find_first_not_of("0123456789") != std::string::npos) return -1;
    return std::stoll(digits);
}

}  // namespace

Outputs::Outputs(const std::string& output, const std::string& option, const std::vector<std::string>& inputs,
                 const OutputPolicy& policy, std::shared_ptr<Transaction> with)
    : output_(output),
      inputs_(inputs),
      policy_(policy),
      transaction_(with ? std::move(with) : std::make_shared<Transaction>()),
      base_(kBase) {
    std::error_code error;
    if (output.empty()) throw failure(Msg::outputNameEmpty, {option});
    // The engine takes both slashes for separators.
    if (folderOf(output_).string().find('\\') != std::string::npos) refuse(Msg::outputBackslash, output_);
    if (fs::is_directory(output_, error)) refuse(Msg::outputIsFolder, output_);
    target_ = followed(output_);
    checkFolder(output_);
    putInOrder(folderOf(output_));
    checkFinal(output_);
    if (target_ == output_) return;
    checkFolder(target_);
    if (folderOf(target_) != folderOf(output_)) putInOrder(folderOf(target_));
}

void Outputs::putInOrder(const fs::path& folder) const {
    if (!policy_.recover) return;
    const auto found = recoverPlace(folder.string(), {.stale = policy_.stale, .sync = policy_.sync});
    if (policy_.quiet) return;
    for (const auto& line : recoveryLines(folder.string(), found, true)) tell(Level::note, line);
}

bool Outputs::isInput(const fs::path& name) const {
    return std::any_of(inputs_.begin(), inputs_.end(),
                       [&](const auto& input) { return sameFile(input, name); });
}

void Outputs::addInputs(const std::vector<std::string>& files) {
    for (const auto& file : files)
        if (std::find(inputs_.begin(), inputs_.end(), file) == inputs_.end()) inputs_.push_back(file);
    if (isInput(output_)) throw failure(Msg::outputIsInput, {output_.string()});
}

void Outputs::checkFinal(const fs::path& name) const {
    if (isInput(name)) throw failure(Msg::outputIsInput, {name.string()});
    std::error_code error;
    const auto status = fs::symlink_status(name, error);
    if (error && status.type() == fs::file_type::none) refuse(name, error.value());
    if (!policy_.overwrite && fs::exists(status)) throw existing(name, policy_);
    if (fs::is_directory(name, error)) refuse(Msg::outputFolderInTheWay, name);
}

void Outputs::number(const NumberedName& name) {
    numbered_ = name;
    expectSet();
}

void Outputs::checkNumbered(const std::string& extension, long long count) const {
    if (numbered_) {
        for (const auto& entry : fs::directory_iterator(folderOf(output_))) {
            const std::string name = entry.path().filename().string();
            const auto number = numbered_->numberOf(name);
            if (!number) continue;
            const fs::path found = sibling(output_, name);
            if (*number < count || !isInput(found)) checkFinal(found);
        }
        return;
    }
    const std::string stem = output_.stem().string() + "#";
    for (const auto& entry : fs::directory_iterator(folderOf(output_))) {
        const std::string name = entry.path().filename().string();
        if (name.rfind(stem, 0) != 0 || entry.path().extension() != "." + extension) continue;
        const std::string number = entry.path().stem().string().substr(stem.size());
        if (number.empty() || number.find_first_not_of("0123456789#") != std::string::npos) continue;
        const fs::path found = sibling(output_, name);
        if (numberIn(name, stem, "." + extension) < count || !isInput(found)) checkFinal(found);
    }
}

std::string Outputs::withFinalNames(std::string text) const {
    if (!place_) return text;
    const std::string hidden = (fs::path(place_->work.path()) / base_).string();
    if (numbered_) {
        for (size_t at = 0; (at = text.find(hidden, at)) != std::string::npos; ++at) {
            const size_t end =
                std::min(text.find_first_not_of(kNameLetters, at + hidden.size()), text.size());
            text.replace(at, end - at, finalName(text.substr(at, end - at), extension_));
        }
        return text;
    }
    const std::string shown =
        (extension_.empty() ? output_ : output_.parent_path() / output_.stem()).string();
    for (size_t at = 0; (at = text.find(hidden, at)) != std::string::npos; at += shown.size())
        text.replace(at, hidden.size(), shown);
    return text;
}

std::string Outputs::hiddenName(const std::string& extension) const {
    return (folderOf(output_) / (kBase + "." + extension)).string();
}

std::string Outputs::begin(const std::string& extension) {
    const fs::path where = folderOf(set_ ? output_ : target_);
    if (const int error = transaction_->enter(where.string(), place_)) refuse(output_, error);
    extension_ = extension;
    if (const size_t number = place_->members++; number > 0) base_ = std::to_string(number) + "-" + kBase;
    fs::path name = fs::path(place_->work.path()) / base_;
    if (!extension.empty()) name += "." + extension;
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
    const std::string rest = written.filename().string().substr(base_.size());
    if (numbered_ && !rest.empty()) return sibling(output_, numberedName(rest, from)).string();
    // Begun without an extension, the file gets the whole name.
    fs::path name = rest.empty() ? output_.filename() : output_.stem();
    name += rest == "." + from ? output_.extension().string() : rest;
    return (output_.has_parent_path() ? output_.parent_path() / name : name).string();
}

bool Outputs::numbers(const std::string& place, const std::string& extension) const {
    const fs::path other(place), own(placeOf(output_));
    if (other.parent_path() != own.parent_path()) return false;
    const std::string name = other.filename().string();
    if (numbered_) return numbered_->matches(name);
    return numberIn(name, output_.stem().string() + "#", "." + extension) >= 0;
}

// Only an output of one file follows a link.
fs::path Outputs::targetOf(const fs::path& name) const { return !set_ && name == output_ ? target_ : name; }

std::string Outputs::placeOf(const fs::path& name) const {
    const fs::path target = targetOf(name);
    std::error_code error;
    return (fs::weakly_canonical(folderOf(target), error) / target.filename()).string();
}

std::vector<fs::path> Outputs::written() const {
    std::vector<fs::path> files;
    if (!place_ || !place_->work) return files;
    const int work = place_->work.handle();
    std::vector<std::string> names;
    if (const int error = listFolder(work, names)) refuse(output_, error);
    if (isRemoved(work)) throw failure(Msg::outputFolderGone, {output_.string()});
    for (const auto& name : names)
        if (name.rfind(base_, 0) == 0) files.push_back(fs::path(place_->work.path()) / name);
    std::sort(files.begin(), files.end());
    return files;
}

// Whether the entry `name` of the output's folder may be removed as one of its former files.
bool Outputs::mayGo(const std::string& name) const {
    std::error_code error;
    const fs::path path = sibling(output_, name);
    return !fs::is_directory(fs::symlink_status(path, error)) && !isInput(path);
}

// The same for numbered names: all that have a number of this form, and next to pictures their sound.
std::vector<std::string> Outputs::formerNumbers(const std::vector<Manifest::Row>& fresh) const {
    std::set<std::string> names, extensions = {""};
    for (const auto& row : fresh) {
        if (entryExists(place_->work.place(), row.name.c_str())) names.insert(row.name);
        const std::string extension = fs::path(row.name).extension().string();
        if (numbered_->matches(row.name, extension)) extensions.insert(extension);
    }
    std::vector<std::string> all;
    if (const int error = listFolder(place_->work.place(), all))
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
        if (!mayGo(name)) continue;
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
        if (entryExists(place_->work.place(), row.name.c_str())) names.insert(row.name);
        if (row.name.rfind(stem, 0) == 0 && ending(row.name).find("##") == 0) shapes.insert(ending(row.name));
    }
    if (shapes.empty()) return {names.begin(), names.end()};
    const bool pictures = std::any_of(shapes.begin(), shapes.end(), isPicture);
    bool hadPictures = false;
    std::vector<std::string> all, sound;
    if (const int error = listFolder(place_->work.place(), all))
        throw failure(Msg::outputNotPlaced, {output_.string(), std::strerror(error)});
    for (const auto& name : all) {
        if (name.rfind(stem, 0) != 0) continue;
        const std::string shape = ending(name);
        const bool isSound = pictures && (shape == ".wav" || shape == "##.wav");
        if ((!isSound && shapes.count(shape) == 0) || !mayGo(name)) continue;
        if (isSound)
            sound.push_back(name);
        else
            names.insert(name);
        hadPictures = hadPictures || isPicture(shape);
    }
    // Sound without pictures may be another file of the user's.
    if (hadPictures) names.insert(sound.begin(), sound.end());
    return {names.begin(), names.end()};
}

// Adds what this output writes and replaces to the set of its place.
void Outputs::plan() {
    std::vector<Manifest::Row> fresh;
    for (const auto& file : written()) {
        const fs::path name = finalName(file, extension_);
        checkFinal(name);
        fresh.push_back({file.filename().string(), targetOf(name).filename().string()});
        names_.push_back(name.string());
        if (policy_.placing) placed_.push_back({file.string(), absoluteName(name.string())});
    }
    const auto first = std::find(names_.begin(), names_.end(), output_.string());
    if (first != names_.end()) std::rotate(names_.begin(), first, first + 1);
    if (fresh.empty()) return;
    Manifest& set = place_->set;
    const auto namesOf = [](const std::vector<Manifest::Row>& rows) {
        std::set<std::string> names;
        for (const auto& row : rows) names.insert(row.name);
        return names;
    };
    auto given = namesOf(set.fresh), taken = namesOf(set.old);
    for (const auto& row : fresh) {
        if (!given.insert(row.name).second)
            throw failure(Msg::outputTwice,
                          {inFolder(place_->folder, row.name).string(), "give one of them another name"});
        set.fresh.push_back(row);
    }
    if (!policy_.overwrite) return;
    for (const auto& name : formerSet(fresh))
        if (taken.insert(name).second) set.old.push_back({"old-" + std::to_string(set.old.size()), name});
    const WorkFolder& work = place_->work;
    for (const auto& row : fresh)
        if (const int error =
                keepAttributes(work.handle(), row.hidden.c_str(), work.place(), row.name.c_str()))
            notPlaced({error, row.name, false}, place_->folder);
}

void Outputs::notPlaced(const PlaceResult& result, const std::string& folder) const {
    const std::string name =
        (result.name.empty() ? output_ : inFolder(folder, std::string(result.name))).string();
    const std::string reason = std::strerror(result.error);
    if (!result.torn && result.error == EEXIST) throw existing(name, policy_);
    if (!result.torn) throw failure(Msg::outputNotPlaced, {name, reason});
    throw failure(Msg::outputTorn, {name, reason, folder});
}

void Outputs::commit() {
    Outputs* const self[] = {this};
    commit(self);
}

void Outputs::commit(std::span<Outputs* const> all) {
    if (all.empty()) return;
    for (Outputs* const one : all) one->plan();
    const Outputs& first = *all.front();
    if (first.policy_.placing) {
        std::vector<PlacedFile> files;
        for (const Outputs* const one : all)
            files.insert(files.end(), one->placed_.begin(), one->placed_.end());
        first.policy_.placing(files);
    }
    const auto result = first.transaction_->commit(first.policy_.overwrite, first.policy_.sync);
    if (!result.synced)
        throw failure(Msg::outputNotSynced, {first.output_.string(), std::strerror(result.moved.error)});
    if (result.moved.error != 0) first.notPlaced(result.moved, result.place->folder);
    first.transaction_->discard();
}
