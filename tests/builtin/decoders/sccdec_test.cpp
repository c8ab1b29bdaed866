#include "builtin/decoders/sccdec.h"

#include "core/engine/status.h"
#include "tests/support/checks.h"

namespace {

constexpr char header[] = "Scenarist_SCC V1.0\n\n";

MediaTime frameTime(long long frame, const QvFramerate& rate = QvFramerate::f29p()) {
    return MediaTime(frame, rate, MediaTime::defaultTimescale);
}

class SccDecoder : public testing::Test {
  protected:
    SccDecoder() { decoder.init(); }

    std::string file(const char* name, const std::string& lines) {
        return folder.write(name, header + lines);
    }
    int open(const std::string& filename) {
        decoder.setParam("filename", filename.c_str());
        return decoder.open();
    }
    // The frames from here to the end that have captions: "3: 0 9420 1 97ae".
    std::string readAll(int most = 1000) {
        std::string text;
        for (int frame = 0; frame < most && decoder.readFrame(0) == 0; ++frame) {
            AnyDict dict;
            if (decoder.readMeta(0, 0, dict) != 0) continue;
            QvCcData data;
            EXPECT_EQ(data.restore(dict), 0);
            text += (text.empty() ? "" : "; ") + std::to_string(frame) + ":";
            for (const auto& pair : data.pairs())
                text += Any::sprintf(" %d %02x%02x", pair.type(), pair.byte1, pair.byte2).asString();
        }
        return text;
    }

    TempFolder folder;
    SccDec decoder;
    LogCapture log;
};

TEST_F(SccDecoder, ShowsTwoFieldsAsOneStream) {
    const auto one = file("a.scc", "00:00:00:02 9420 942c\n00:00:00:29 942f\n00:00:00:05 94ae\n");
    const auto two = file("b.scc", "00:00:00:02 1520\n00:00:01:01 15ae\n00:00:00:28 1520");
    ASSERT_EQ(open(one + "," + two), 0);
    EXPECT_TRUE(log.contains("Opened field 1 scc file " + one + ", fr detected as 29.97p"));
    EXPECT_EQ(decoder.nrFrames(0), 32);
    EXPECT_EQ(decoder.getParam("readRate"), Any(QvFramerate::f29p())) << "as detected";
    EXPECT_EQ(decoder.duration(qvSubpicStream, 0), frameTime(32));
    EXPECT_EQ(decoder.getParam("inOut").asDict(),
              AnyDict("inField1", frameTime(2), "outField1", frameTime(29), "inField2", frameTime(2),
                      "outField2", frameTime(31)));
    EXPECT_EQ(readAll(), "2: 0 9420 0 942c 1 1520; 5: 0 94ae; 28: 1 1520; 29: 0 942f; 31: 1 15ae");
    EXPECT_EQ(decoder.readFrame(0), QvStatus::endOfStream);
    EXPECT_EQ(decoder.seekToFrame(28, 0), 0);
    EXPECT_EQ(readAll(1), "0: 1 1520");
    EXPECT_EQ(decoder.seekToFrame(-1, 0), QvStatus::endOfStream);

    decoder.seekToFrame(0, 0);
    decoder.setParam("offset", frameTime(20));
    EXPECT_EQ(decoder.getSubpicParam(0, "first").asMediaTime(), frameTime(-18));
    EXPECT_EQ(decoder.getSubpicParam(0, "last").asMediaTime(), frameTime(11));
    EXPECT_EQ(readAll(), "8: 1 1520; 9: 0 942f; 11: 1 15ae");
    ASSERT_EQ(decoder.open(), 0);
    decoder.setParam("offset", 0.0);
    decoder.setParam("readRate", QvFramerate::f59p());
    EXPECT_EQ(readAll(), "4: 0 9420 0 942c 1 1520; 10: 0 94ae; 56: 1 1520; 58: 0 942f; 62: 1 15ae");
}

TEST_F(SccDecoder, OpensWhatHasCaptions) {
    const auto good = file("a.scc", "00:00:00:29 9420\n"), empty = file("b.scc", "");
    const auto drop = file("c.scc", "00:01:00;02 9420\n"), comma = file("d,e.scc", "00:00:00:25 9420\n");
    const auto alien = folder.write("f.scc", "1\n00:00:01,000\n"), few = file("g.scc", "00:00:00:05 1520");
    const auto none = folder.file("none.scc");
    const struct {
        std::string names;
        int result;
        const char* error;
    } rows[] = {
        {comma, 0, ""},
        {none + "," + good, 0, ""},
        {good + "," + empty, 0, ""},
        {empty, -9, "No input files found, exiting"},
        {drop, -9, "No input files found, exiting"},
        {none, -9, "No input files found, exiting"},
        {alien, -9, "Failed to open field 1 scc file "},
    };
    for (const auto& row : rows) {
        EXPECT_EQ(open(row.names), row.result) << row.names;
        EXPECT_TRUE(std::string(decoder.errorDesc()).starts_with(row.error)) << row.names;
        EXPECT_EQ(decoder.nrStreams(0), row.result == 0 ? 1 : 0);
        decoder.close();
    }
    EXPECT_TRUE(log.contains("Opened empty field 2 scc file " + good + ".")) << "the name of field 1";
    EXPECT_TRUE(
        log.contains("There is no file " + none + " for the captions of field 1", QvLogMask::warning));

    decoder.setParam("dropFrameLines", 1);
    ASSERT_EQ(open(drop), 0);
    EXPECT_TRUE(decoder.getParam("framerate").asFramerate().df());
    EXPECT_EQ(readAll(3000), "1800: 0 9420");

    // The field that seems slower is read again at the rate of the other.
    ASSERT_EQ(open(few + "," + good), 0);
    EXPECT_TRUE(log.contains("Detected framerates differ, using higher one", QvLogMask::warning));
    EXPECT_EQ(readAll(), "5: 0 1520; 29: 1 9420");
    decoder.setParam("framerate", 25);
    ASSERT_EQ(open(few), 0);
    EXPECT_TRUE(decoder.getParam("framerate").asFramerate().is25p());
    for (const auto& [name, value] : {std::pair("framerate", Any(0)),
                                      {"offset", Any(1e300)},
                                      {"filenames", Any(AnyVector(1))},
                                      {"filename", Any(3)}})
        EXPECT_EQ(decoder.setParam(name, value), QvStatus::invalidParam) << name;
}

}  // namespace
