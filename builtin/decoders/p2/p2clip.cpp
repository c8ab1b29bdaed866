#include "builtin/decoders/p2/p2clip.h"

#include <algorithm>
#include <cctype>
#include <charconv>
#include <map>
#include <set>

#include "core/arch/qvexception.h"
#include "core/document/xmldom.h"
#include "core/engine/files/qvfileutil.h"

namespace {

constexpr long long maxDocumentBytes = 1 << 20;
constexpr std::size_t maxDocuments = 4096;  // read in search of the parts of a take
constexpr std::size_t maxParts = 32;
constexpr std::size_t maxNamesShown = 6;

std::string textOf(const Any& value) { return value.toString().asString(""); }

Any named(const std::string& text) { return Any(text.c_str()); }

bool sameLetters(const std::string& a, const std::string& b) {
    return std::equal(a.begin(), a.end(), b.begin(), b.end(),
                      [](unsigned char x, unsigned char y) { return std::toupper(x) == std::toupper(y); });
}

// Of a folder, without asking the disc.
std::string parentOf(std::string folder) {
    while (folder.size() > 1 && folder.back() == '/') folder.pop_back();
    if (folder.empty() || folder == ".") return "..";
    const std::size_t slash = folder.rfind('/');
    const std::string last = slash == std::string::npos ? folder : folder.substr(slash + 1);
    if (last == "..") return folder + "/..";
    if (slash == std::string::npos) return ".";
    return slash == 0 ? "/" : folder.substr(0, slash);
}

// The entry of a folder with this name in any case of letters; empty if there is none.
std::string entryOf(const std::string& folder, const std::string& name) {
    for (const Any& entry : QvFile::ls(named(folder), 0))
        if (sameLetters(textOf(QvFile::getFilename(entry)), name)) return textOf(entry);
    return "";
}

std::string folderIn(const std::string& folder, const std::string& name) {
    const std::string found = entryOf(folder, name);
    return QvFile::isDir(named(found)) ? found : "";
}

std::vector<std::string> documentsIn(const std::string& folder) {
    std::vector<std::string> names;
    for (const Any& entry : QvFile::ls(named(folder), 1))
        if (QvFile::getExt(entry, true) == "xml") names.push_back(textOf(entry));
    std::sort(names.begin(), names.end());
    return names;
}

// --- Documents.

const XmlNode* childOf(const XmlNode* node, const char* name) { return node ? node->child(name) : nullptr; }

std::string dataOf(const XmlNode* node) {
    if (!node) return "";
    const std::string text = node->data();
    const auto blank = [](unsigned char c) { return std::isspace(c) != 0; };
    const auto begin = std::find_if_not(text.begin(), text.end(), blank);
    const auto end = std::find_if_not(text.rbegin(), text.rend(), blank).base();
    return begin < end ? std::string(begin, end) : "";
}

// Two digits four times; any other text is no place in time.
std::string timecodeIn(const std::string& text) {
    if (text.size() != 11) return "";
    for (std::size_t i = 0; i < text.size(); ++i) {
        const bool between = i % 3 == 2;
        if (between ? text[i] != ':' && text[i] != ';' : !std::isdigit(static_cast<unsigned char>(text[i])))
            return "";
    }
    return text;
}

// A whole text of digits from 1 on, or 0.
int numberIn(const std::string& text) {
    int number = 0;
    const char* const end = text.data() + text.size();
    const auto read = std::from_chars(text.data(), end, number);
    return read.ec == std::errc() && read.ptr == end ? std::max(number, 0) : 0;
}

// "25" units of "1/25" seconds.
P2Length lengthIn(const std::string& duration, const std::string& unit) {
    const std::size_t slash = unit.find('/');
    if (slash == std::string::npos) return {};
    const int num = numberIn(unit.substr(0, slash)), den = numberIn(unit.substr(slash + 1));
    return num > 0 && den > 0 ? P2Length{numberIn(duration), num, den} : P2Length{};
}

P2Fault readDocument(const Any& document, P2Clip& clip) {
    const P2Fault foreign{"it is no document of a P2 clip", true};
    if (QvFile::flength(document) > maxDocumentBytes) return foreign;
    XmlParser parser;
    try {
        if (parser.parseFile(document) != 0) return foreign;
    } catch (const QvFileException& failure) {
        return {failure.what(), true};
    }
    XmlNode* root = parser.topLevel();
    if (!root || !root->name()) return foreign;
    root->stripXMLNamespace(true);
    if (std::string(root->name()) != "P2Main") return foreign;
    const XmlNode* content = root->child("ClipContent");
    clip.document = document;
    clip.name = dataOf(childOf(content, "ClipName"));
    if (clip.name.empty()) return {"the document has no ClipName"};
    clip.id = dataOf(childOf(content, "GlobalClipID"));
    clip.length = lengthIn(dataOf(childOf(content, "Duration")), dataOf(childOf(content, "EditUnit")));
    clip.userName = dataOf(childOf(childOf(content, "ClipMetadata"), "UserClipName"));
    const XmlNode* connection = childOf(childOf(content, "Relation"), "Connection");
    clip.previousId = dataOf(childOf(childOf(connection, "Previous"), "GlobalClipID"));
    clip.nextId = dataOf(childOf(childOf(connection, "Next"), "GlobalClipID"));
    const XmlNode* essence = childOf(content, "EssenceList");
    for (int i = 0; essence && i < essence->nrChildren(); ++i) {
        const XmlNode& node = *essence->child(i);
        const std::string kind = node.name() ? node.name() : "";
        if (kind == "Video" && !clip.hasPicture) {
            clip.hasPicture = true;
            clip.startTimecode = timecodeIn(dataOf(node.child("StartTimecode")));
        }
        clip.nrSounds += kind == "Audio";
    }
    if (!clip.hasPicture) return {"the clip '" + clip.name + "' has no picture"};
    if (clip.nrSounds > P2Clip::maxSounds)
        return {"the clip '" + clip.name + "' has " + std::to_string(clip.nrSounds) + " sounds, more than " +
                std::to_string(P2Clip::maxSounds)};
    return {};
}

// --- Files.

std::string contentsOf(const P2Clip& clip) { return parentOf(textOf(QvFile::getPath(clip.document))); }

P2Fault findFiles(P2Clip& clip) {
    const std::string contents = contentsOf(clip);
    const auto find = [&](const char* folder, const std::string& name, Any& found) {
        const std::string place = folderIn(contents, folder);
        const std::string file = place.empty() ? "" : entryOf(place, name);
        found = named(file);
        return QvFile::isFile(found)
                   ? P2Fault()
                   : P2Fault{"its file " + std::string(folder) + "/" + name + " is missing"};
    };
    if (P2Fault fault = find("VIDEO", clip.name + ".MXF", clip.picture); !fault.empty()) return fault;
    clip.sounds.resize(static_cast<std::size_t>(clip.nrSounds));
    for (std::size_t i = 0; i < clip.sounds.size(); ++i) {
        const std::string number = (i < 10 ? "0" : "") + std::to_string(i);
        if (P2Fault fault = find("AUDIO", clip.name + number + ".MXF", clip.sounds[i]); !fault.empty())
            return fault;
    }
    return {};
}

// Which document describes a clip, in the folder of a clip and those of the cards next to its own.
class ClipIndex {
  public:
    explicit ClipIndex(const P2Clip& clip) {
        const std::string own = textOf(QvFile::getPath(clip.document));
        add(own.empty() ? "." : own);
        const std::string card = parentOf(contentsOf(clip));
        for (const Any& other : QvFile::ls(named(parentOf(card)), 0)) {
            const std::string contents = folderIn(textOf(other), "CONTENTS");
            const std::string folder = contents.empty() ? "" : folderIn(contents, "CLIP");
            if (!folder.empty() && !QvFile::isSameFile(named(folder), named(own))) add(folder);
        }
    }
    // Null if there is none.
    const P2Clip* find(const std::string& id) const {
        const auto found = clips_.find(id);
        return found == clips_.end() ? nullptr : &found->second;
    }

  private:
    std::map<std::string, P2Clip> clips_;
    std::size_t read_ = 0;

    void add(const std::string& folder) {
        for (const std::string& document : documentsIn(folder)) {
            if (++read_ > maxDocuments) return;
            P2Clip clip;
            if (readDocument(named(document), clip).empty() && !clip.id.empty())
                clips_.try_emplace(clip.id, clip);
        }
    }
};

P2Fault missingPart(const char* which, const P2Clip& clip) {
    return {std::string("the part ") + which + " the clip '" + clip.name +
            "' is not here; put the folders of all cards of this take next to each other"};
}

}  // namespace

P2Fault p2FindDocument(const Any& name, Any& document) {
    document = name;
    if (!QvFile::isDir(name)) return {};
    std::string folder = textOf(name);
    if (const std::string contents = folderIn(folder, "CONTENTS"); !contents.empty()) folder = contents;
    if (const std::string clips = folderIn(folder, "CLIP"); !clips.empty()) folder = clips;
    std::vector<P2Clip> clips;
    std::set<std::string> ids;
    for (const std::string& file : documentsIn(folder)) {
        P2Clip clip;
        if (clips.size() >= maxDocuments || !readDocument(named(file), clip).empty()) continue;
        ids.insert(clip.id);
        clips.push_back(clip);
    }
    // Those that begin a take, as far as it is here.
    std::erase_if(clips,
                  [&](const P2Clip& clip) { return !clip.previousId.empty() && ids.count(clip.previousId); });
    if (clips.empty()) return {"the folder holds no P2 clip", true};
    document = clips.front().document;
    if (clips.size() == 1) return {};
    std::string list;
    for (std::size_t i = 0; i < std::min(clips.size(), maxNamesShown); ++i)
        list += (i ? ", " : "") + textOf(QvFile::getFilename(clips[i].document));
    return {"the folder holds " + std::to_string(clips.size()) + " clips: " + list +
            (clips.size() > maxNamesShown ? ", ..." : "") + "; give one of these files in CONTENTS/CLIP"};
}

P2Fault p2ReadTake(const Any& document, bool join, std::vector<P2Clip>& parts) {
    parts.clear();
    P2Clip clip;
    if (P2Fault fault = readDocument(document, clip); !fault.empty()) return fault;
    if (join && (!clip.previousId.empty() || !clip.nextId.empty())) {
        const ClipIndex index(clip);
        std::set<std::string> seen{clip.id};
        while (!clip.previousId.empty()) {
            const P2Clip* before = index.find(clip.previousId);
            if (!before) return missingPart("before", clip);
            if (!seen.insert(before->id).second) return {"the parts of its take go round in a circle"};
            clip = *before;
        }
        seen = {clip.id};
        parts.push_back(clip);
        while (!parts.back().nextId.empty()) {
            const P2Clip* next = index.find(parts.back().nextId);
            if (!next) return missingPart("after", parts.back());
            if (!seen.insert(next->id).second) return {"the parts of its take go round in a circle"};
            if (parts.size() == maxParts)
                return {"its take has more than " + std::to_string(maxParts) + " parts"};
            parts.push_back(*next);
        }
    } else {
        parts.push_back(clip);
    }
    for (P2Clip& part : parts)
        if (P2Fault fault = findFiles(part); !fault.empty()) return fault;
    return {};
}
