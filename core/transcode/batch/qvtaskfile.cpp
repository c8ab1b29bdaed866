#include "core/transcode/batch/qvtaskfile.h"

#include <algorithm>
#include <charconv>
#include <cstdlib>
#include <memory>
#include <new>
#include <set>
#include <string_view>
#include <unordered_set>
#include <vector>

#include "core/arch/qvexception.h"
#include "core/document/xmldom.h"
#include "core/document/xmlline_p.h"
#include "core/document/xmltrans.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/measure/streamtype.h"
#include "core/transcode/task/qvtaskstate.h"
#include "core/value/numbertext_p.h"

namespace {

using Text = std::string_view;

constexpr const char* rootName = "TranscodeTask";

// An element with the way to it.
struct Place {
    const XmlNode* node = nullptr;
    std::string path;
    std::vector<int> children;  // numbers of elements from the root, as qvXmlLine takes them

    Text name() const { return node->name() ? node->name() : ""; }
    Place child(int index, const std::string& step) const {
        Place place{node->child(index), path.empty() ? step : path + "/" + step, children};
        place.children.push_back(index);
        return place;
    }
    // The value of a key, or a place without a node.
    Place entry(Text key) const {
        for (int i = 0; i + 1 < node->nrChildren(); i += 2)
            if (key == node->child(i)->data()) return child(i + 1, std::string(key));
        return {nullptr, path, children};
    }
    explicit operator bool() const { return node != nullptr; }
};

struct Fault {
    Place place;
    int status;
    std::string reason;
};

[[noreturn]] void damaged(const Place& place, const std::string& reason) {
    throw Fault{place, QvStatus::invalidStructure, reason};
}

// Whether the whole text is a number of this type, within its range. The reader itself accepts more: it stops
// at the first wrong character, and clamps to the range.
template <class Number>
bool isNumber(Text text) {
    text = qvnumber::begin(text);
    text = text.substr(0, text.find_last_not_of(qvnumber::blanks) + 1);
    Number value = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    return error == std::errc() && end == text.data() + text.size();
}

enum class Range { i32, i64 };

bool isWhole(Text text, Range range) {
    return range == Range::i32 ? isNumber<int>(text) : isNumber<long long>(text);
}

std::string notWhole(Range range) {
    return std::string("is no whole number of ") + (range == Range::i32 ? "32" : "64") + " bits";
}

std::string attribute(const XmlNode& node, const char* name) {
    const Any text = node.getAttr(name).toString();
    return text.asString("");
}

// --- The values.

struct Numbers {
    Text element;
    Range range;
    const char *attributes[4], *others[4];
};

// Elements whose attributes are numbers: those that must be there, and others.
constexpr Numbers numbersOf[] = {
    {"framerate", Range::i32, {"num", "denom"}, {"df", "interlaced", "pulldown"}},
    {"pt", Range::i32, {"x", "y"}, {}},
    {"rect", Range::i32, {"top", "bottom", "left", "right"}, {}},
    {"pair", Range::i32, {"first", "second"}, {}},
    {"mediatime", Range::i64, {"ticks", "scale"}, {}},
    {"bitrate", Range::i32, {}, {"target", "min", "max", "mode"}},  // what is 0 is not written
};

bool isDictionary(const Place& place) {
    for (const Text plain : {"inv", "i32", "i64", "fl", "str", "wstr", "gen", "vec"})
        if (place.name() == plain) return false;
    for (const Numbers& row : numbersOf)
        if (place.name() == row.element) return false;
    return true;
}

void checkValue(const Place& place);

void checkDictionary(const Place& place) {
    const XmlNode& node = *place.node;
    for (int i = 0; i < node.nrChildren(); i += 2) {
        const XmlNode& key = *node.child(i);
        if (Text(key.name() ? key.name() : "") != "key")
            damaged(place.child(i, std::to_string(i + 1)), "a key is missing before this value");
        const std::string name = key.data();
        if (name.empty()) damaged(place.child(i, std::to_string(i + 1)), "the key is empty");
        if (i + 1 == node.nrChildren()) damaged(place.child(i, name), "the key has no value");
        checkValue(place.child(i + 1, name));
    }
}

void checkAttributes(const Place& place, const Numbers& row) {
    const auto check = [&](const char* one, bool required) {
        const std::string text = one ? attribute(*place.node, one) : "0";
        if ((required || !text.empty()) && !isWhole(text, row.range))
            damaged(place, std::string("its '") + one + "' " + notWhole(row.range));
    };
    for (const char* one : row.attributes) check(one, true);
    for (const char* one : row.others) check(one, false);
}

void checkValue(const Place& place) {
    const Text name = place.name(), data = place.node->data();
    for (const auto& [type, range] : {std::pair{"i32", Range::i32}, std::pair{"i64", Range::i64}})
        if (name == type && !isWhole(data, range)) damaged(place, "it " + notWhole(range));
    if (name == "fl" && !isNumber<double>(data)) damaged(place, "it is no number");
    if (name == "key") damaged(place, "the key before it has no value");
    for (const Numbers& row : numbersOf)
        if (name == row.element) checkAttributes(place, row);
    if (name == "vec")
        for (int i = 0; i < place.node->nrChildren(); ++i) checkValue(place.child(i, std::to_string(i + 1)));
    if (isDictionary(place)) checkDictionary(place);
}

// --- What a task holds.

Place dictionary(const Place& parent, Text key) {
    const Place found = parent.entry(key);
    if (!found) damaged(parent, "'" + std::string(key) + "' is missing");
    if (!isDictionary(found) || found.node->nrChildren() == 0) damaged(found, "it holds no settings");
    return found;
}

Place list(const Place& parent, Text key, const char* what) {
    const Place found = parent.entry(key);
    if (!found) damaged(parent, "'" + std::string(key) + "' is missing");
    if (found.name() != "vec" || found.node->nrChildren() == 0)
        damaged(found, std::string("it holds no ") + what);
    for (int i = 0; i < found.node->nrChildren(); ++i)
        if (const Place row = found.child(i, std::to_string(i + 1)); !isDictionary(row))
            damaged(row, std::string("this is no ") + what);
    return found;
}

std::string text(const Place& parent, Text key) {
    const Place found = parent.entry(key);
    if (!found) damaged(parent, "'" + std::string(key) + "' is missing");
    if (found.name() != "str" && found.name() != "wstr") damaged(found, "it is no text");
    return found.node->data();
}

int streamType(const Place& stream) {
    const Place found = stream.entry("type");
    if (!found) damaged(stream, "'type' is missing");
    const Text data = found.name() == "i32" ? found.node->data() : "";
    if (data == "1" || data == "2" || data == "4") return data[0] - '0';
    damaged(found, "it is no type of stream: 1 is video, 2 audio, 4 subpicture");
}

// The points of a source: times, in and out in turn.
void checkPoints(const Place& source) {
    const Place process = source.entry("process");
    const Place points = process && isDictionary(process) ? process.entry("inOutPoints") : Place();
    if (!points) return;
    if (points.name() != "vec" || points.node->nrChildren() % 2 != 0)
        damaged(points, "it holds no pairs of times");
    for (int i = 0; i < points.node->nrChildren(); ++i)
        if (const Place point = points.child(i, std::to_string(i + 1)); point.name() != "mediatime")
            damaged(point, "it is no time");
}

using Names = std::unordered_set<std::string>;

// `files`: the names that the file may have; null for any, as with several segments a file that is not listed
// is opened with the defaults of its kind.
void checkSource(const Place& source, int type, const Names* files) {
    const std::string file = text(source, "file");
    if (file.empty()) damaged(source.entry("file"), "the name is empty");
    if (files && files->count(file) == 0) damaged(source.entry("file"), "no entry of 'files' has this name");
    const Place stream = source.entry("stream");
    if (!stream || stream.name() != "pair")
        damaged(stream ? stream : source, "there is no pair of stream numbers");
    if (attribute(*stream.node, "first") != std::to_string(type))
        damaged(stream, "its type is not that of the output's stream");
    if (attribute(*stream.node, "second")[0] == '-') damaged(stream, "its number is negative");
    checkPoints(source);
}

int sourceCount(const Place& stream) {
    const Place sources = isDictionary(stream) ? stream.entry("sources") : Place();
    return sources && sources.name() == "vec" ? sources.node->nrChildren() : 0;
}

// How many segments the streams have; those without a source do not count.
int segmentCount(const Place& streams) {
    int common = 0;
    for (int i = 0; i < streams.node->nrChildren(); ++i) {
        const Place stream = streams.child(i, std::to_string(i + 1));
        const int own = sourceCount(stream);
        if (own == 0) continue;
        if (common != 0 && own != common)
            damaged(stream.entry("sources"), "it has " + std::to_string(own) +
                                                 " segments, and another stream " + std::to_string(common));
        common = own;
    }
    return common;
}

// Which segments are enabled: a number for each.
void checkSegments(const Place& root, int count) {
    const Place flags = root.entry("segments");
    if (!flags) return;
    if (flags.name() != "vec" || flags.node->nrChildren() != count)
        damaged(flags, "it does not have one number for each of the " + std::to_string(count) + " segments");
    for (int i = 0; i < count; ++i)
        if (const Place flag = flags.child(i, std::to_string(i + 1)); flag.name() != "i32")
            damaged(flag, "it is no number");
}

void checkStreams(const Place& root, const Names& files) {
    const Place made = list(dictionary(root, "encoder"), "streams", "output stream");
    const Place streams = list(root, "streams", "output stream");
    const int segments = segmentCount(streams);
    for (int i = 0; i < std::min(made.node->nrChildren(), streams.node->nrChildren()); ++i) {
        const std::string number = std::to_string(i + 1);
        const Place stream = streams.child(i, number);
        if (stream.node->nrChildren() == 0) continue;  // without a source
        const int type = streamType(stream);
        if (type != streamType(made.child(i, number)))
            damaged(stream, "the encoder's stream has another type");
        const Place given = stream.entry("sources");
        if (!given || (given.name() == "vec" && given.node->nrChildren() == 0)) continue;
        const Place sources = list(stream, "sources", "source");
        for (int k = 0; k < sources.node->nrChildren(); ++k)
            checkSource(sources.child(k, std::to_string(k + 1)), type, segments == 1 ? &files : nullptr);
    }
    if (made.node->nrChildren() < streams.node->nrChildren() && segments > 1)
        damaged(streams, "the encoder has fewer streams");
    checkSegments(root, segments);
}

void checkTask(const Place& root) {
    if (root.name() != rootName)
        damaged(root, "this is no task: its outermost element is '" + std::string(root.name()) + "'");
    const std::string version = attribute(*root.node, "version");
    if (version.empty()) damaged(root, "its version is missing");
    if (!isNumber<double>(version)) damaged(root, "its version is no number");
    checkDictionary(root);
    for (const Text key : {"__version__", "__class__"})
        if (const Place own = root.entry(key)) damaged(own, "this is no key of a file");
    Names names;
    const Place files = list(root, "files", "input file");
    for (int i = 0; i < files.node->nrChildren(); ++i) {
        const Place file = files.child(i, std::to_string(i + 1));
        const std::string name = text(file, "filename");
        if (name.empty()) damaged(file.entry("filename"), "the name is empty");
        names.insert(name);
    }
    checkStreams(root, names);
}

// --- The modules that it names.

using Modules = std::set<std::pair<int, std::string>>;  // those that are there, by kind

// `named` is a text, or a dictionary that has the name as an attribute or a key. Without a name nothing is
// checked.
void checkModule(Modules& present, const Place& named, int type, const char* kind) {
    if (!named) return;
    std::string name = isDictionary(named) ? attribute(*named.node, "name") : "";
    const Place key = isDictionary(named) ? named.entry("name") : named;
    if (name.empty() && key && (key.name() == "str" || key.name() == "wstr")) name = key.node->data();
    if (name.empty() || present.count({type, name}) > 0) return;
    const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(name.c_str()));
    if (!codec || !codec->getInterface(type))
        throw Fault{named, QvStatus::failed, std::string("there is no ") + kind + " '" + name + "' here"};
    present.emplace(type, name);
}

// The filters of a stream that have no fixed place.
void checkFilters(Modules& present, const Place& source, int type) {
    const Place process = source.entry("process");
    const Place filters = process && isDictionary(process) ? process.entry("filters") : process;
    const Place custom = filters && isDictionary(filters) ? filters.entry("customFilters") : filters;
    if (!custom || custom.name() != "vec") return;
    for (int i = 0; i < custom.node->nrChildren(); ++i)
        checkModule(present, custom.child(i, std::to_string(i + 1)),
                    type == qvVideoStream ? QvModuleType::videoFilter : QvModuleType::audioFilter, "filter");
}

void checkModules(const Place& root) {
    const Place files = root.entry("files"), encoder = root.entry("encoder");
    Modules present;
    for (int i = 0; i < files.node->nrChildren(); ++i)
        checkModule(present, files.child(i, std::to_string(i + 1)).entry("decoder"), QvModuleType::decoder,
                    "decoder");
    checkModule(present, encoder.entry("muxer"), QvModuleType::muxer, "multiplexer");
    const Place streams = encoder.entry("streams");
    for (int i = 0; i < streams.node->nrChildren(); ++i) {
        const Place stream = streams.child(i, std::to_string(i + 1));
        const int type = streamType(stream);
        if (type != qvSubpicStream)
            checkModule(present, stream.entry("codec"),
                        type == qvVideoStream ? QvModuleType::videoEncoder : QvModuleType::audioEncoder,
                        "encoder");
    }
    const Place outputs = root.entry("streams");
    for (int i = 0; i < outputs.node->nrChildren(); ++i) {
        const Place output = outputs.child(i, std::to_string(i + 1));
        const Place sources = output.entry("sources");
        for (int k = 0; sources && k < sources.node->nrChildren(); ++k)
            checkFilters(present, sources.child(k, std::to_string(k + 1)), streamType(output));
    }
}

// --- The file.

QvTaskFault faultOf(const Any& file, const Fault& fault) {
    return {fault.status, fault.place.path, qvXmlLine(file, fault.place.children), fault.reason};
}

// "Error in xml file NAME REASON at line N".
QvTaskFault syntaxFault(const Any& file, const std::string& text) {
    const Any name = file.toString();
    const std::string before = std::string("Error in xml file ") + name.asString("") + " ",
                      mark = " at line ";
    const std::size_t line = text.rfind(mark);
    if (text.rfind(before, 0) != 0 || line == std::string::npos)
        return {QvStatus::cannotParse, "", 0, "it can't be opened"};
    return {QvStatus::cannotParse, "", std::atoi(text.c_str() + line + mark.size()),
            text.substr(before.size(), line - before.size())};
}

// What the output says when it can't be made, as the rest of a sentence.
std::string reasonOf(const QvEncodePipe& pipe) {
    std::string said = pipe.errorCode() != QvStatus::ok ? pipe.errorDesc() : "";
    if (said.size() > 1 && said[0] >= 'A' && said[0] <= 'Z' && said[1] >= 'a')
        said[0] = static_cast<char>(said[0] + ('a' - 'A'));
    std::string reason = "the output can't be made from these settings";
    if (!said.empty()) reason += ": " + said;
    while (reason.back() == '.') reason.pop_back();
    return reason;
}

// Makes the output once, for what only its modules know.
void tryEncoder(const Place& root, const AnyDict& state) {
    const std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    if (!pipe) throw Fault{root.entry("encoder"), QvStatus::failed, "the module 'encpipe' is missing"};
    try {
        if (pipe->restore(state.getDict("encoder")) == QvStatus::ok) return;
    } catch (const QvMemoryFailure&) {
        throw;
    } catch (const QvException&) {
    }
    throw Fault{root.entry("encoder"), QvStatus::failed, reasonOf(*pipe)};
}

QvTaskFault checked(const Any& file, AnyDict& state) {
    if (!file.isText()) return {QvStatus::cannotParse, "", 0, "it has no name"};
    XmlParser parser;
    try {
        parser.parseFile(file);
    } catch (const QvFileException& failure) {
        return syntaxFault(file, failure.what());
    }
    try {
        const Place root{parser.topLevel(), "", {}};
        checkTask(root);
        Any name, version;
        if (XmlParser::restoreDict(file, state, name, version) != QvStatus::ok)
            throw Fault{root, QvStatus::cannotParse, "the file has changed meanwhile"};
        checkModules(root);
        tryEncoder(root, state);
    } catch (const Fault& fault) {
        return faultOf(file, fault);
    }
    return {};
}

// `action` with its exceptions as faults.
template <class Action>
QvTaskFault guarded(Action action) noexcept {
    try {
        try {
            return action();
        } catch (const QvMemoryFailure&) {
        } catch (const QvException&) {
            return {QvStatus::failed, "", 0, "the engine refuses it"};
        }
    } catch (const std::bad_alloc&) {
    } catch (...) {
        return {QvStatus::failed, "", 0, "it is refused"};  // short: these texts need no memory
    }
    return {QvStatus::outOfMemory, "", 0, "out of memory"};
}

}  // namespace

QvTaskFault QvTaskFile::check(const Any& file) noexcept {
    return guarded([&] {
        AnyDict state;
        return checked(file, state);
    });
}

QvTaskFault QvTaskFile::check(const AnyDict& state) noexcept {
    return guarded([&]() -> QvTaskFault {
        const Any& kind = state.get("__class__");
        const Any& version = state.get("__version__");
        if (!(kind == rootName)) return {QvStatus::invalidStructure, "", 0, "this is no task"};
        if (!version.isString()) return {QvStatus::invalidStructure, "", 0, "its version is missing"};
        // As it would be in a file of its own.
        AnyDict plain = state;
        plain.remove("__class__");
        plain.remove("__version__");
        const auto root = std::make_unique<XmlNode>(rootName);
        root->setAttr("version", version);
        XmlTrans().DictToXml(plain, root.get());
        const Place whole{root.get(), "", {}};
        try {
            checkTask(whole);
            checkModules(whole);
            tryEncoder(whole, state);
        } catch (const Fault& fault) {
            return {fault.status, fault.place.path, 0, fault.reason};
        }
        return {};
    });
}

QvTask* QvTaskFile::open(const Any& file, QvDPipeList& decoders, QvEncodePipe** encoder,
                         QvFileOpenCb* callback, QvTaskFault* fault, int options) noexcept {
    std::unique_ptr<QvTask> task;
    QvEncodePipe* pipe = nullptr;
    QvDPipeList opened;
    const int before = decoders.size();
    QvTaskFault found = guarded([&]() -> QvTaskFault {
        AnyDict stored;
        if (QvTaskFault first = checked(file, stored); first.status != QvStatus::ok) return first;
        const QvTaskState state(stored);
        Any error;
        try {
            if (const int segments = state.nrSegments();
                segments == 0 || (segments == 1 && state.isSegmentEnabled(0)))
                task.reset(QvTask::fromState(state, opened, &pipe, 0, callback, &error));
            else
                task.reset(QvBatchTask::fromState(state, opened, &pipe, options, callback, &error));
        } catch (const QvMemoryFailure&) {
            throw;
        } catch (const QvException&) {
            if (!error.isValid()) error = "an input can't be opened, or lacks a stream";
        }
        if (!task) return {QvStatus::failed, "files", 0, error.asString("")};
        for (int i = 0; i < opened.size(); ++i) decoders.append(opened.at(i));
        return {};
    });
    if (found.status == QvStatus::ok) {
        if (encoder) *encoder = pipe;
    } else {
        while (decoders.size() > before) decoders.remove(before);
        task.reset();
        delete pipe;
        opened.deleteAll();
    }
    if (fault) *fault = std::move(found);
    return task.release();
}
