#include "tarsel/job/task/storedtask.h"

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <new>
#include <unordered_set>

#include "tarsel/host/files.h"
#include "tarsel/host/memory.h"
#include "tarsel/job/task/taskfiles.h"
#include "tarsel/words/messages.h"

namespace fs = std::filesystem;

namespace {

constexpr const char* kClass = "TranscodeTask";

// What the factory says of inputs that it can't open.
struct OpenReport : QvFileOpenCb {
    std::string file, reason;  // of the first failure

    int fileOpenFinished(int result, QvFileOpenCbData& data) override {
        if (result == QvStatus::ok || !file.empty()) return 0;
        file = data.filename.toString().asString("");
        reason = data.text.toString().asString("");
        return 0;
    }
};

const char* typeWord(int type) {
    return type == qvVideoStream ? "video" : type == qvAudioStream ? "audio" : "subpicture";
}

// Null if it can't be opened.
std::unique_ptr<QvDecodePipe> openFile(const QvTaskState& state, const Any& name) {
    for (const Any& entry : state.inputFiles()) {
        const QvTaskState::File file(entry.asDict());
        if (!(file.filename() == name)) continue;
        try {
            return std::unique_ptr<QvDecodePipe>(QvDecFactory::restoreDecoder(name, file.decoder(), nullptr));
        } catch (const QvAssertFailure&) {
            return nullptr;
        }
    }
    return nullptr;
}

std::vector<std::string> inputsIn(AnyDict state) {
    std::vector<std::string> names;
    std::unordered_set<std::string> known;
    changeTaskFiles(state, [&](const std::string& name, TaskFileUse use) {
        if (use == TaskFileUse::input && known.insert(name).second) names.push_back(name);
        return name;
    });
    return names;
}

std::string fromFolder(const std::string& name, const fs::path& folder) {
    const fs::path path(name);
    return path.is_absolute() ? name : (folder / path).lexically_normal().string();
}

}  // namespace

void requireTask(const std::string& file) {
    requireInput(file);
    const QvTaskFault fault = QvTaskFile::check(Any(file.c_str()));
    if (fault.status == QvStatus::outOfMemory) throw std::bad_alloc();
    if (fault.line > 0)
        throw failure(Msg::taskDamaged, {file, std::to_string(fault.line),
                                         fault.path.empty() ? "the document" : fault.path, fault.reason});
    if (fault.status != QvStatus::ok) throw failure(Msg::taskRefused, {file, fault.reason});
}

std::string writeTask(const AnyDict& state, const std::string& file) {
    try {
        errno = 0;
        if (XmlParser::storeDict(Any(file.c_str()), state, kClass, Any("2.0")) != QvStatus::ok)
            return "the job can't be stored";
    } catch (const QvFileException& error) {
        return errno != 0 ? std::string(": ") + std::strerror(errno) : error.what();
    }
    return "";
}

void makeAbsolute(AnyDict& state) {
    changeTaskFiles(state, [](const std::string& name, TaskFileUse) { return absoluteName(name); });
}

void makeRelative(AnyDict& state, const std::string& folder) {
    const fs::path base = absoluteName(folder.empty() ? "." : folder);
    changeTaskFiles(state, [&](const std::string& name, TaskFileUse) {
        return fs::path(absoluteName(name)).lexically_relative(base).string();
    });
}

StoredTask::StoredTask(const std::string& file) : name_(file) {
    requireTask(file);
    Any root, version;
    if (XmlParser::restoreDict(Any(file.c_str()), raw_, root, version) != QvStatus::ok)
        throw failure(Msg::taskRefused, {file, "it can't be read"});
    const fs::path folder = fs::path(absoluteName(file)).parent_path();
    AnyDict state = raw_;
    changeTaskFiles(state, [&](const std::string& name, TaskFileUse) { return fromFolder(name, folder); });
    qualityLogs_ = takeQualityLogs(state);
    state_ = QvTaskState(state);
}

StoredTask::StoredTask(const AnyDict& state, const std::string& name) : name_(name) {
    const auto node = std::make_unique<XmlNode>(kClass);
    XmlTrans trans;
    trans.DictToXml(state, node.get());
    trans.XmlToDict(node.get(), raw_);
    for (const char* key : {"__class__", "__version__"}) raw_.set(key, state.get(key));  // of the document
    state_ = QvTaskState(raw_);
}

StoredTask::~StoredTask() {
    task_.reset();
    decoders_.deleteAll();
}

QvTaskState StoredTask::enabled() const {
    QvTaskState state = state_;
    for (int i = state.nrSegments() - 1; i >= 0; --i)
        if (!state.isSegmentEnabled(i)) state.removeSegment(i);
    std::unordered_set<std::string> used;
    for (int i = 0; i < state.streams_in().size(); ++i)
        for (const Any& source : state.sources(i))
            if (source.isDict()) used.insert(source.asDict().get("file").toString().asString(""));
    AnyVector files;
    for (const Any& file : state.inputFiles())
        if (used.count(file.asDict().get("filename").toString().asString("")) > 0) files.append(file);
    state.set("files", files);
    return state;
}

std::vector<std::string> StoredTask::inputs() const { return inputsIn(enabled()); }

std::vector<std::string> StoredTask::allInputs() const { return inputsIn(state_); }

std::string StoredTask::output() const { return state_.outputFilename().toString().asString(""); }

std::string StoredTask::postProcess() const { return state_.postprocessCommand().toString().asString(""); }

bool StoredTask::isJoin() const { return state_.nrSegments() != 1 || !state_.isSegmentEnabled(0); }

void StoredTask::discardOutput() {
    AnyDict encoder = state_.getDict("encoder");
    encoder.set("muxer", Any(AnyDict("name", "nullmux")));
    state_.set("encoder", encoder);
}

// The first stream that the task takes from an input which lacks it, as a sentence; "" if there is none.
std::string StoredTask::missingStream() const {
    const int streams = state_.encoder().nrStreams();
    for (int segment = 0; segment < state_.nrSegments(); ++segment)
        for (int i = 0; i < streams; ++i) {
            const QvTaskState::Source source = state_.source(i, segment);
            if (source.empty() || !state_.isSegmentEnabled(segment)) continue;
            const auto decoder = openFile(state_, source.filename());
            if (!decoder || source.number() < decoder->nrStreams(source.type())) continue;
            return std::string("it takes ") + typeWord(source.type()) + " stream " +
                   std::to_string(source.number()) + " of " +
                   inQuotes(source.filename().toString().asString("")) + ", which is not there";
        }
    return "";
}

void StoredTask::open() {
    for (const std::string& name : inputs()) requireInput(name);
    QvTaskState used = state_;
    used.set("files", enabled().inputFiles());
    const MemoryWatch memory;
    OpenReport report;
    QvEncodePipe* pipe = nullptr;
    Any error;
    try {
        constexpr int options = QvBatchTask::skipDisabled | QvBatchTask::everySegmentOpens;
        if (isJoin())
            task_.reset(QvBatchTask::fromState(used, decoders_, &pipe, options, &report, &error));
        else
            task_.reset(QvTask::fromState(used, decoders_, &pipe, 0, &report, &error));
    } catch (const QvException&) {
        error = Any();
    }
    pipe_.reset(pipe);
    if (!task_ && memory.ranOut()) throw std::bad_alloc();
    if (!report.file.empty()) throw failure(Msg::inputRefused, {report.file, report.reason});
    if (!task_) {
        // What the engine says of a stream that can't be linked is meant for programmers.
        std::string reason = missingStream();
        if (reason.empty() && isJoin()) reason = error.toString().asString("");
        if (reason.empty()) reason = "an input can't give what the task takes from it";
        throw failure(Msg::taskRefused, {name_, reason});
    }
    task_->setPostprocessCommand(Any());  // a run of the engine would run it
}

std::vector<std::unique_ptr<Source>> StoredTask::sources() const {
    std::vector<std::unique_ptr<Source>> sources;
    for (QvDecodePipe* const decoder : task_->decoders())
        sources.push_back(std::string_view(decoder->name()) == "batchdec"
                              ? std::make_unique<Source>(name_, *decoder)
                              : std::make_unique<Source>(*decoder));
    return sources;
}
