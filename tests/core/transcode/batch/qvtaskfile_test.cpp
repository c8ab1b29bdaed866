#include "core/transcode/batch/qvtaskfile.h"

#include <cmath>
#include <sstream>

#include "core/encode/qvencodepipe.h"
#include "core/engine/status.h"
#include "core/transcode/task/qvtranscodetask.h"
#include "tests/core/transcode/batch/soundtask.h"
#include "tests/support/checks.h"

namespace {

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

// An encoder that keeps a quality has a bit rate of 0, for one.
TEST(QvTaskFile, AllThatIsStoredIsSound) {
    const TaskFile file;
    AnyDict state;
    Any root, version;
    ASSERT_EQ(XmlParser::restoreDict(file.name.c_str(), state, root, version), 0);
    AnyVector values;
    for (const Any& value : {Any(), Any(QvBitrate()), Any(QvBitrate(1, 0, 0, 5)), Any(QvBitrate(9, 1)),
                             Any(Pair()), Any(MediaTime()), Any(QvFramerate()), Any(-1LL), Any(1e300),
                             Any(std::nan("")), Any(""), Any(AnyDict()), Any(AnyVector())})
        values.append(value);
    state.set("values", values);
    ASSERT_EQ(XmlParser::storeDict(file.name.c_str(), state, "TranscodeTask", "2.0"), 0);
    const QvTaskFault fault = QvTaskFile::check(file.name.c_str());
    EXPECT_EQ(fault.status, 0) << fault.path << ": " << fault.reason;
}

TEST(QvTaskFile, AFaultHasItsPlaceAndReason) {
    const TaskFile file;
    const std::string wav = "<str>" + file.folder.file("in.wav");
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
        {"<key>rate", "\"25\"", "\"fast\"", "rate", "its 'num' is no whole number of 32 bits", "<framerate"},
        {"<key>gain", "<key>gain</key>", "", "5", "a key is missing before this value", ""},
        {"<key>streams</key>\n  <vec>", "<str>", "<str>no", "streams/1/sources/1/file",
         "no entry of 'files' has this name", "<str>"},
        {"<key>streams</key>\n  <vec>", "first=\"2\"", "first=\"1\"", "streams/1/sources/1/stream",
         "its type is not that of the output's stream", "<pair"},
        {"<key>streams</key>\n  <vec>", "<i32>2", "<i32>7", "streams/1/type",
         "it is no type of stream: 1 is video, 2 audio, 4 subpicture", "<i32>"},
        {"<key>encoder", "rawaenc", "rawbenc", "encoder/streams/1/codec",
         "there is no encoder 'rawbenc' here", ""},
        {"<key>encoder", "rawaenc", "rawvenc", "encoder/streams/1/codec",
         "there is no encoder 'rawvenc' here", ""},
        {"<key>encoder", "\"rawmux\"", "\"rawdec\"", "encoder/muxer", "there is no multiplexer 'rawdec' here",
         ""},
        {"<key>filename", "</str>", "</str><key>decoder</key><dict><key>name</key><str>vawdec</str></dict>",
         "files/1/decoder", "there is no decoder 'vawdec' here", ""},
        {"<key>streams</key>\n  <vec>", "<key>stream</key>",
         "<key>process</key><dict><key>filters</key><dict><key>customFilters</key><vec><dict><key>name</key>"
         "<str>blur</str></dict></vec></dict></dict><key>stream</key>",
         "streams/1/sources/1/process/filters/customFilters/1", "there is no filter 'blur' here", ""},
        {"<key>profile", "<i32>3", "<i32>4", "encoder",
         "the output can't be made from these settings: cannot restore - base profile 44996239 () not "
         "available",
         ""},
        {"<Tr", "\"2.0\"", "\"new\"", "", "its version is no number", "<Tr"},
        {"<key>gain", "<key>gain</key>", "<key>__version__</key>", "__version__", "this is no key of a file",
         ""},
        {"<key>files", wav.c_str(), "<str>", "files/1/filename", "the name is empty", "<str>"},
        {"<key>streams</key>\n  <vec>", "<i32>2", "<i32>4294967298", "streams/1/type",
         "it is no whole number of 32 bits", "<i32>"},
        {"<key>rate", "\"25\"", "\"4294967321\"", "rate", "its 'num' is no whole number of 32 bits",
         "<framerate"},
        {"<Tr", "<key>gain", "<key>b</key><bitrate type=\"vbr\" target=\"x\"/><key>gain", "b",
         "its 'target' is no whole number of 32 bits", ""},
        {"<key>rate", "interlaced=\"0\"", "interlaced=\"yes\"", "rate",
         "its 'interlaced' is no whole number of 32 bits", "<framerate"},
    };
    const struct {
        const char *what, *from, *to, *path, *reason;
    } ofSegments[] = {
        {"points that are no times", "<key>stream</key>",
         "<key>process</key><dict><key>inOutPoints</key><vec><i32>1</i32><i32>2</i32></vec></dict>"
         "<key>stream</key>",
         "streams/1/sources/1/process/inOutPoints/1", "it is no time"},
        {"half a pair of points", "<key>stream</key>",
         "<key>process</key><dict><key>inOutPoints</key><vec><mediatime ticks=\"1\" "
         "scale=\"1\"/></vec></dict>"
         "<key>stream</key>",
         "streams/1/sources/1/process/inOutPoints", "it holds no pairs of times"},
        {"another number of segments", "<key>sources</key>\n      <vec>",
         "<key>sources</key>\n      <vec><dict/>", "streams/2/sources",
         "it has 1 segments, and another stream 2"},
        {"flags of more segments", "<key>streams</key>\n  <vec>",
         "<key>segments</key><vec><i32>1</i32><i32>1</i32></vec><key>streams</key>\n  <vec>", "segments",
         "it does not have one number for each of the 1 segments"},
        {"a flag that is no number", "<key>streams</key>\n  <vec>",
         "<key>segments</key><vec><str>1</str></vec><key>streams</key>\n  <vec>", "segments/1",
         "it is no number"},
    };
    for (const auto& row : ofSegments) {
        const QvTaskFault fault = file.check(file.with("<key>files", row.from, row.to));
        EXPECT_EQ(fault.path, row.path) << row.what;
        EXPECT_EQ(fault.reason, row.reason) << row.what;
    }
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

TEST(QvTaskFile, SeveralSegmentsAreABatchTask) {
    const TaskFile file;
    const std::string more = "<key>sources</key>\n      <vec>";
    const std::size_t at = file.text.find("<dict>", file.text.find(more)), end = file.text.find("</vec>", at);
    const std::string source = file.text.substr(at, end - at), wav = file.folder.file("in.wav");
    std::string missing = source;
    missing.replace(missing.find(wav), wav.size(), file.folder.file("none.wav"));
    const struct {
        const char* what;
        std::string second, flags;
        int options;
        int segments;  // -1: a plain task, -2: none
        const char* reason;
    } rows[] = {
        {"two", source, "", 3, 2, ""},
        {"one", "", "", 3, -1, ""},
        {"one, disabled", "", "0", 3, -2, "bailing out."},
        {"one of two is missing", missing, "", 3, -2, "none.wav' in input segment 1"},
        {"it may be missing", missing, "", 1, 2, ""},
        {"a disabled one is missing", missing, "10", 3, 2, ""},
        {"a count from elsewhere", source, "11<", 3, 2, ""},
    };
    for (const auto& row : rows) {
        std::string text = file.text;
        for (std::size_t from = 0; (from = text.find(more, from)) != std::string::npos; from += more.size())
            text.insert(text.find("</vec>", text.find("<pair", from)), row.second);
        std::string flags;
        for (const char flag : row.flags.substr(0, row.flags.find('<')))
            flags += std::string("<i32>") + flag + "</i32>";
        if (!flags.empty())
            text.insert(
                text.find("  <key>streams</key>\n  <vec>"),
                "<key>segments</key><vec>" + flags + "</vec>" +
                    (row.flags.find('<') == std::string::npos ? "" : "<key>#nsegs</key><i32>7</i32>"));
        file.folder.write("job.xml", text);
        QvDPipeList decoders;
        QvEncodePipe* pipe = nullptr;
        QvTaskFault fault;
        std::unique_ptr<QvTask> task(
            QvTaskFile::open(file.name.c_str(), decoders, &pipe, nullptr, &fault, row.options));
        const std::unique_ptr<QvEncodePipe> owned(pipe);
        const auto* batch = dynamic_cast<const QvBatchTask*>(task.get());
        EXPECT_EQ(!task ? -2 : batch ? batch->nrSegments() : -1, row.segments) << row.what;
        EXPECT_NE(fault.reason.find(row.reason), std::string::npos) << row.what << ": " << fault.reason;
        task.reset();
        decoders.deleteAll();
    }
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
