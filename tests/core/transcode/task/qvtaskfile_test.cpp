#include "core/transcode/task/qvtaskfile.h"

#include <sstream>

#include "core/document/xmldom.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/status.h"
#include "core/transcode/task/qvtranscodetask.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/temp_folder.h"
#include "tests/support/wav_bytes.h"

namespace {

// The file of a task: two WAV files into raw sound.
struct TaskFile {
    TaskFile() {
        const std::string wav = folder.write("in.wav", riff(wavChunk("fmt ", wavFormat(1, 2, 48000, 16)) +
                                                            wavChunk("data", patternBytes(1920))));
        std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
        pipe->clearStreams();
        pipe->addAudioStream(Any("rawaenc"));
        pipe->addAudioStream(Any("rawaenc"));
        AnyDict encoder, state;
        pipe->store(encoder);
        const auto stream = [&](int number) {
            const AnyDict source("file", wav.c_str(), "stream", Any(Pair(2, number)));
            return Any(AnyDict("type", 2, "sources", AnyVector(Any(source))));
        };
        const Any file(AnyDict("filename", wav.c_str()));
        state = AnyDict("__version__", "2.0", "encoder", encoder, "files", AnyVector(file, file), "streams",
                        AnyVector(stream(0), stream(0)), "rate", Any(QvFramerate(25.0)), "gain", 0.5);
        name = folder.file("job.xml");
        XmlParser::storeDict(name.c_str(), state, "TranscodeTask", "2.0");
        text = TempFolder::read(name);
    }

    QvTaskFault check(const std::string& document) const {
        folder.write("job.xml", document);
        return QvTaskFile::check(name.c_str());
    }
    // The first `from` after `after` becomes `to`.
    std::string with(const std::string& after, const std::string& from, const std::string& to) const {
        std::string changed = text;
        const std::size_t start = changed.find(after), at = changed.find(from, start);
        EXPECT_NE(start, std::string::npos) << after;
        EXPECT_NE(at, std::string::npos) << from;
        return changed.replace(at, from.size(), to);
    }

    EngineScope engine;
    TempFolder folder;
    std::string name, text;
};

int lineOf(const std::string& text, std::size_t at) {
    return 1 +
           static_cast<int>(std::count(text.begin(), text.begin() + static_cast<std::ptrdiff_t>(at), '\n'));
}

TEST(QvTaskFile, ASoundOneOpens) {
    const TaskFile file;
    const QvTaskFault fault = file.check(file.text);
    EXPECT_EQ(fault.status, 0) << fault.path << ": " << fault.reason;
    QvDPipeList decoders;
    QvEncodePipe* pipe = nullptr;
    const std::unique_ptr<QvTask> task(QvTaskFile::open(file.name.c_str(), decoders, &pipe));
    ASSERT_TRUE(task);
    const std::unique_ptr<QvEncodePipe> owned(pipe);
    EXPECT_EQ(task->nrLinks(), 2);
    decoders.deleteAll();
}

TEST(QvTaskFile, AFaultHasItsPlaceAndReason) {
    const TaskFile file;
    const struct {
        const char *after, *from, *to;
        const char *path, *reason,
            *at;  // the element begins at the first `at` after `after`, unless it is ""
    } rows[] = {
        {"<Tr", "TranscodeTask version", "List version", "", "mismatched tag", "</TranscodeTask>"},
        {"<Tr", " version=\"2.0\"", "", "", "its version is missing", "<Tr"},
        {"<key>files", "files", "fils", "", "'files' is missing", ""},
        {"<key>files", "filename", "name", "files/1", "'filename' is missing", "<dict>"},
        {"<key>gain", "0.5", "0,5", "gain", "it is no number", "<fl>"},
        {"<key>rate", "\"25\"", "\"fast\"", "rate", "its 'num' is no whole number", "<framerate"},
        {"<key>gain", "<key>gain</key>", "", "5", "a key is missing before this value", ""},
        {"<key>streams</key>\n  <vec>", "<str>", "<str>no", "streams/1/sources/1/file",
         "no entry of 'files' has this name", "<str>"},
        {"<key>streams</key>\n  <vec>", "first=\"2\"", "first=\"1\"", "streams/1/sources/1/stream",
         "its type is not that of the output's stream", "<pair"},
        {"<key>streams</key>\n  <vec>", "<i32>2", "<i32>7", "streams/1/type",
         "it is no type of stream: 1 is video, 2 audio, 4 subpicture", "<i32>"},
        {"<key>encoder", "rawaenc", "rawbenc", "encoder", "the output can't be made from these settings",
         "<EncodePipe"},
        {"<key>profile", "<i32>", "<i32>99", "encoder", "the output can't be made from these settings", ""},
    };
    for (const auto& row : rows) {
        const std::string changed = file.with(row.after, row.from, row.to);
        const QvTaskFault fault = file.check(changed);
        SCOPED_TRACE(row.reason);
        EXPECT_NE(fault.status, 0);
        EXPECT_EQ(fault.path, row.path);
        EXPECT_EQ(fault.reason, row.reason);
        if (*row.at) {
            EXPECT_EQ(fault.line, lineOf(changed, changed.find(row.at, file.text.find(row.after))));
        }
    }
    EXPECT_EQ(QvTaskFile::check(file.folder.file("none.xml").c_str()).status, QvStatus::cannotParse);
    EXPECT_EQ(QvTaskFile::check(Any(7)).status, QvStatus::cannotParse);
    EXPECT_EQ(file.check("<doc/>").reason, "this is no task: its outermost element is 'doc'");
}

// Whatever is done to a line: no exception, and what passes the check does not assert in a restore either.
TEST(QvTaskFile, NoDamageThrows) {
    const TaskFile file;
    std::istringstream lines(file.text);
    std::vector<std::string> all;
    for (std::string line; std::getline(lines, line);) all.push_back(line);
    int faults = 0;
    for (std::size_t i = 0; i < all.size(); ++i)
        for (const char* instead :
             {"", "<inv/>", "<dict/>", "<vec/>", "<i32>-1</i32>", "<str>x</str>", "<key>x</key>"}) {
            std::string changed;
            for (std::size_t k = 0; k < all.size(); ++k) changed += (k == i ? instead : all[k]) + "\n";
            const bool sound = file.check(changed).status == QvStatus::ok;
            faults += !sound;
            QvDPipeList decoders;
            QvEncodePipe* pipe = nullptr;
            QvTaskFault fault;
            const std::unique_ptr<QvTask> task(
                QvTaskFile::open(file.name.c_str(), decoders, &pipe, nullptr, &fault));
            EXPECT_EQ(fault.status == QvStatus::ok, task != nullptr);
            EXPECT_NE(fault.reason, "the engine refuses it") << "line " << i + 1 << " is " << instead;
            EXPECT_TRUE(sound || !task);
            delete pipe;
            decoders.deleteAll();
        }
    EXPECT_GT(faults, static_cast<int>(all.size()) * 3);
}

}  // namespace
