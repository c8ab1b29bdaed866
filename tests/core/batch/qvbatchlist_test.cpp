#include "core/batch/qvbatchlist.h"

#include <climits>

#include "core/document/xmldom.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"

namespace {

QvTaskState named(const char* name) {
    QvTaskState task;
    task.set("__class__", "TranscodeTask");
    task.setOutputFilename(name);
    task.set("streams",
             AnyVector(AnyDict("type", 2, "sources", AnyVector(AnyDict("file", "a"), AnyDict("file", "b")))));
    return task;
}

QvBatchList listOf(const char* names) {
    QvBatchList list;
    for (const char* name = names; *name; ++name) list.append(named(std::string(1, *name).c_str()));
    return list;
}

std::string namesOf(const QvBatchList& list) {
    std::string names;
    for (int i = 0; i < list.size(); ++i) names += list[i].outputFilename().toString().asString("?");
    return names;
}

}  // namespace

TEST(QvBatchList, ExchangesTasks) {
    const struct {
        int index, delta;
        bool moved;
        const char* result;
    } moves[] = {
        {0, 1, true, "bacd"},        {0, 3, true, "dbca"},        {3, -3, true, "dbca"},
        {2, 0, true, "abcd"},        {0, -1, false, "abcd"},      {3, 1, false, "abcd"},
        {4, 0, false, "abcd"},       {4, -1, false, "abcd"},      {-1, 1, false, "abcd"},
        {1, INT_MAX, false, "abcd"}, {1, INT_MIN, false, "abcd"}, {INT_MAX, INT_MAX, false, "abcd"},
    };
    for (const auto& move : moves) {
        QvBatchList list = listOf("abcd");
        EXPECT_EQ(list.moveTask(move.index, move.delta), move.moved) << move.index << " " << move.delta;
        EXPECT_EQ(namesOf(list), move.result) << move.index << " " << move.delta;
    }
    QvBatchList list = listOf("abc");
    EXPECT_TRUE(list.moveTaskUp(2));
    EXPECT_TRUE(list.moveTaskDown(0));
    EXPECT_FALSE(list.moveTaskUp(0));
    EXPECT_EQ(namesOf(list), "cab");
}

TEST(QvBatchList, FindsOutputFilesInBothWidths) {
    QvBatchList list = listOf("aba");
    list.append(named("\xC3\xA4.avi"));
    QvTaskState none = named("x");
    none.remove("filename");
    list.append(none);
    EXPECT_EQ(list.findByOutputFile("a"), 2);
    EXPECT_EQ(list.findByOutputFile(wide("b")), 1);
    EXPECT_EQ(list.findByOutputFile(wide("\xC3\xA4.avi")), 3);
    for (const Any& absent : {Any("c"), Any(""), Any(), Any(1)}) {
        EXPECT_EQ(list.findByOutputFile(absent), -1);
        EXPECT_FALSE(list.hasOutputFile(absent));
    }
    EXPECT_TRUE(list.hasOutputFile("b"));
    EXPECT_FALSE(list.hasOutputFile("b", 1));
    EXPECT_TRUE(list.hasOutputFile("a", 0));
}

TEST(QvBatchList, ForwardsToItsTasks) {
    QvBatchList list = listOf("ab");
    EXPECT_TRUE(list.isTaskEnabled(1));
    list.setTaskEnabled(1, false);
    EXPECT_FALSE(list.isTaskEnabled(1));
    EXPECT_TRUE(list.isTaskEnabled(0));
    list.setSegmentEnabled(0, 1, false);
    EXPECT_TRUE(list.isSegmentEnabled(0, 0));
    EXPECT_FALSE(list.isSegmentEnabled(0, 1));
    EXPECT_EQ(list.removeSegment(0, 0), 0);
    EXPECT_EQ(list[0].nrSegments(), 1);
    EXPECT_FALSE(list.isSegmentEnabled(0, 0));
    list.replace(0, named("new"));
    EXPECT_EQ(list.front().outputFilename(), "new");
    EXPECT_EQ(list.back().outputFilename(), "b");
    QvBatchList other;
    other.swap(list);
    EXPECT_TRUE(list.empty());
    other.remove(0);
    EXPECT_EQ(namesOf(other), "b");
}

TEST(QvBatchList, AssertsIndexes) {
    QvBatchList list = listOf("ab");
    const std::function<void()> wrong[] = {
        [&] { list.at(2); },
        [&] { list.at(-1); },
        [&] { QvBatchList().front(); },
        [&] { QvBatchList().back(); },
        [&] { list.remove(2); },
        [&] { list.replace(2, QvTaskState()); },
        [&] { list.setTaskEnabled(2, true); },
        [&] { list.isTaskEnabled(-1); },
        [&] { list.isSegmentEnabled(0, 2); },
        [&] { list.setSegmentEnabled(0, 2, true); },
        [&] { list.removeSegment(0, 2); },
        [&] { list.removeSegment(5, 0); },
    };
    for (const auto& action : wrong) EXPECT_THROW(action(), QvAssertFailure);
    EXPECT_EQ(namesOf(list), "ab");
}

TEST(QvBatchList, KeepsItselfInADictionary) {
    const QvBatchList list = listOf("ab");
    AnyDict dict;
    list.store(dict);
    QvBatchList other = listOf("x");
    EXPECT_EQ(other.restore(AnyDict("taskList", 5)), -1);
    EXPECT_EQ(other.restore(AnyDict()), -1);
    EXPECT_EQ(namesOf(other), "x");
    EXPECT_EQ(other.restore(dict), 0);
    EXPECT_EQ(other, list);
}

// --- Files.

class BatchFile : public testing::Test {
  protected:
    std::string file(const std::string& text) { return folder_.write("list.xml", text); }

    EngineScope engine_;
    TempFolder folder_;
};

TEST_F(BatchFile, HoldsTenThousandTasks) {
    QvBatchList list;
    for (int i = 0; i < 10000; ++i) list.append(named((std::to_string(i) + ".avi").c_str()));
    list.setTaskEnabled(77, false);
    const std::string name = folder_.file("list.xml");
    ASSERT_EQ(list.save(narrow(name)), 0);
    EXPECT_EQ(list.size(), 10000);
    QvBatchList read;
    ASSERT_EQ(read.load(wide(name)), 0);
    ASSERT_EQ(read.size(), 10000);
    EXPECT_FALSE(read.isTaskEnabled(77));
    for (int i = 0; i < read.size(); ++i) ASSERT_EQ(read[i], list[i]) << i;
    const std::string text = TempFolder::read(name);
    EXPECT_NE(text.find("<!DOCTYPE BatchList>"), std::string::npos);
    EXPECT_NE(text.find("<BatchList version=\"2.0\">"), std::string::npos);

    EXPECT_EQ(QvBatchList().save(narrow(name)), 0);
    EXPECT_EQ(read.load(narrow(name)), 0);
    EXPECT_TRUE(read.empty());
}

TEST_F(BatchFile, ThatIsNoneChangesNothing) {
    const std::string task = "<TranscodeTask><key>filename</key><str>z</str></TranscodeTask>";
    const auto document = [](const std::string& type, const std::string& inside) {
        return "<" + type + " version=\"2.0\">" + inside + "</" + type + ">";
    };
    const std::string tasks = "<key>taskList</key><vec>" + task + "</vec>";
    const std::string invalid =
        "Failed to load batch from '" + folder_.file("list.xml") + "', invalid file contents";
    const char* format = "Failed to import batch data, invalid format";
    const struct {
        std::string text;
        int result;
        std::vector<std::string> log;
    } files[] = {
        {"", -9, {"could not parse file"}},
        {"<BatchList><key>taskList</key><vec>", -9, {"could not parse file"}},
        {document("BatchList", ""), -9, {"could not parse file"}},
        {document("BatchList", repeated("<vec>", 2000) + repeated("</vec>", 2000)), -9, {"could not parse"}},
        {document("QvBatch", "<key>batchJob</key><vec>" + task + "</vec>"),
         -1,
         {"Failed to import batch data, old format not supported."}},
        {document("QvBatch", tasks), -1, {format}},
        {document("BatchList", "<key>taskList</key><i32>1</i32>"), -1, {format}},
        {document("BatchList", "<key>other</key><vec/>"), -1, {format}},
        {document("BatchList", "<key>taskList</key><vec>" + task + "<i32>1</i32></vec>"), -1, {format}},
        {document("Other", "<key>other</key><vec/>"), -1, {invalid, format}},
        {document("Other", tasks), 0, {invalid}},
        {document("BatchList", tasks), 0, {}},
    };
    for (const auto& row : files) {
        QvBatchList list = listOf("ab");
        LogCapture log;
        EXPECT_EQ(list.load(narrow(file(row.text))), row.result) << row.text.substr(0, 200);
        EXPECT_EQ(namesOf(list), row.result == 0 ? "z" : "ab");
        for (const std::string& line : row.log) EXPECT_TRUE(log.contains(line, QvLogMask::error)) << line;
        EXPECT_EQ(log.contains("Failed"), !row.log.empty());
    }
    QvBatchList list = listOf("ab");
    for (const Any& name : {narrow(folder_.file("none.xml")), narrow(folder_.path()), Any(), Any(3), Any("")})
        EXPECT_EQ(list.load(name), -9);
    EXPECT_EQ(namesOf(list), "ab");
}

TEST_F(BatchFile, ThatCanNotBeWrittenStaysAsItWas) {
    const std::string name = folder_.file("list.xml");
    ASSERT_EQ(listOf("old").save(narrow(name)), 0);
    const std::string before = TempFolder::read(name);
    QvBatchList list = listOf("abcdefgh");
    LogCapture log;
    {
        FullDisc disc(100);
        const PlatformScope scope(disc);
        EXPECT_EQ(list.save(narrow(name)), -1);
    }
    EXPECT_TRUE(log.contains("Failed to save batch to '" + name + "'", QvLogMask::error));
    EXPECT_EQ(namesOf(list), "abcdefgh");
    EXPECT_EQ(TempFolder::read(name), before);
    for (const Any& none : {narrow(folder_.file("no/folder.xml")), narrow(folder_.path()), Any(), Any("")})
        EXPECT_EQ(list.save(none), -1);
    EXPECT_EQ(namesOf(list), "abcdefgh");
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(folder_.path()), {}), 1) << "litter";
    EXPECT_EQ(list.save(narrow(name)), 0);
    QvBatchList read;
    EXPECT_EQ(read.load(narrow(name)), 0);
    EXPECT_EQ(namesOf(read), "abcdefgh");
}

TEST_F(BatchFile, IsOnTheDiscBeforeItReplacesAnother) {
    struct Disc : QvPlatform {
        int sync(std::FILE* file) override {
            steps += "sync ";
            return fails ? -1 : QvPlatform::sync(file);
        }
        int moveFile(const char* from, const char* to, bool replace) override {
            steps += "move ";
            return QvPlatform::moveFile(from, to, replace);
        }
        std::string steps;
        bool fails = false;
    } disc;
    const std::string name = folder_.file("list.xml");
    ASSERT_EQ(listOf("old").save(narrow(name)), 0);
    {
        const PlatformScope scope(disc);
        EXPECT_EQ(listOf("ab").save(narrow(name)), 0);
        EXPECT_EQ(disc.steps, "sync move ");
        disc.fails = true;
        EXPECT_EQ(listOf("never").save(narrow(name)), -1);
    }
    QvBatchList read;
    EXPECT_EQ(read.load(narrow(name)), 0);
    EXPECT_EQ(namesOf(read), "ab");
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(folder_.path()), {}), 1) << "litter";
}

TEST_F(BatchFile, SubstitutesEncodersThatAreMissing) {
    const auto codecsOf = [](const QvBatchList& list) {
        std::string names;
        for (int i = 0; i < list.size(); ++i) {
            const QvTaskState task = list[i];
            for (const Any& stream : task.streams_out())
                names += std::string(stream.asDict().getDict("codec").getString("name", "?")) + " ";
        }
        return names;
    };
    QvBatchList list;
    QvTaskState task = named("a");
    AnyVector streams;
    for (const char* codec : {"h264venc", "rawvenc", "unknown"})
        streams.append(AnyDict("type", 1, "codec", AnyDict("name", codec, "kept", 1)));
    streams.append(AnyDict("type", 4));
    streams.append(7);
    task.set("encoder", AnyDict("streams", streams));
    list.append(task);
    task.set("encoder", AnyDict("streams", 5));
    list.append(task);
    const std::string name = folder_.file("list.xml");
    ASSERT_EQ(list.save(narrow(name)), 0);

    QvBatchList read;
    ASSERT_EQ(read.load(narrow(name)), 0);
    EXPECT_EQ(codecsOf(read), "h264venc rawvenc unknown ? ? ") << "what would stand in is not installed";

    struct Encoder : QvModule {
        Encoder() : QvModule(QvModuleType::videoEncoder, "bch264venc", "fake", nullptr) {}
        QvCodec* create() override { return nullptr; }
    };
    QvPlugin plugin("fakes", "an encoder that is only a name");
    plugin.setAttr("filename", "builtin");
    plugin.addModule(new Encoder);
    qv_registry()->addPlugin(&plugin);
    LogCapture log;
    ASSERT_EQ(read.load(narrow(name)), 0);
    qv_registry()->cleanup();
    EXPECT_EQ(codecsOf(read), "bch264venc rawvenc unknown ? ? ");
    const QvTaskState first = read[0];
    EXPECT_EQ(first.streams_out().at(0).asDict().getDict("codec").getInt32("kept"), 1);
    EXPECT_EQ(log.count("BatchList: substituting 'bch264venc' for 'h264venc'", QvLogMask::debug), 1);
}
