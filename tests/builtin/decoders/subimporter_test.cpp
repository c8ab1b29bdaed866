#include "builtin/decoders/subimporter.h"

#include <gtest/gtest.h>

#include <string>

#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "tests/support/log_capture.h"
#include "tests/support/temp_folder.h"

namespace {

const char* const srt = "1\n00:00:01,000 --> 00:00:02,000\na|b\n\n2\n00:00:03,000 --> 00:00:04,500\nc\n\n";

class Importer : public testing::Test {
  protected:
    Importer() { decoder.init(); }
    int open(const char* name, const std::string& bytes) {
        decoder.setParam("filename", folder.write(name, bytes).c_str());
        decoder.setParam("framerate", QvFramerate(10.0));
        return decoder.open();
    }
    std::string shown() {
        AnyDict dict;
        if (decoder.readMeta(0, 0, dict) != 0) return "";
        EXPECT_EQ(dict["text"], decoder.subtitle()->text);
        return dict.getString("text");
    }

    TempFolder folder;
    SubImporter decoder;
};

TEST_F(Importer, DescribesItsStreamAndShowsWhatBelongsToEachFrame) {
    ASSERT_EQ(open("a.srt", srt), 0);
    EXPECT_EQ(decoder.nrStreams(0), 1);
    ASSERT_EQ(decoder.nrStreams(qvSubpicStream), 1);
    AnyDict format,
        expected("type", 1, "format", 1, "count", 2, "encoding", 0, "framerate", QvFramerate(10.0), "first",
                 MediaTime(1.0), "last", MediaTime(3.0), "duration", MediaTime(2.0));
    expected.set("codec", "SubRip");
    expected.set("textEncoding", "ASCII");
    expected.set("end", MediaTime(4.5));
    decoder.getStreamParams(qvSubpicStream, 0, format);
    EXPECT_EQ(format, expected);
    EXPECT_EQ(decoder.duration(qvSubpicStream, 0), MediaTime(4.5));

    std::string seen;
    while (decoder.readFrame(0) == 0) seen += shown().empty() ? '.' : shown() == "a|b" ? '1' : '2';
    EXPECT_EQ(seen, "..........11111111111.........2222222222222222");
    EXPECT_EQ(decoder.nrFrames(0), static_cast<int>(seen.size()));
    ASSERT_EQ(decoder.seek(MediaTime(2.0), qvSubpicStream, 0), 0);
    EXPECT_EQ(shown(), "") << "nothing has been read there yet";
    decoder.readFrame(0);
    EXPECT_EQ(shown(), "a|b");
    for (const long long outside : {-1LL, 1LL << 40})
        EXPECT_EQ(decoder.seekToFrame(outside, 0), QvStatus::endOfStream);
    ASSERT_EQ(decoder.seekToFrame(2147483647, 0), 0);
    EXPECT_EQ(decoder.readFrame(0), QvStatus::endOfStream);
}

TEST_F(Importer, FramesMayBeReadAtAnotherRate) {
    ASSERT_EQ(open("a.sub", "{10}{20}a\n"), 0);
    decoder.setParam("readRate", QvFramerate(50.0));
    EXPECT_EQ(decoder.nrFrames(0), 101);
    decoder.seekToFrame(49, 0);
    for (const char* text : {"", "a"}) {
        decoder.readFrame(0);
        EXPECT_EQ(shown(), text);
    }
}

TEST_F(Importer, BadFilesAreRefusedOrTold) {
    EXPECT_EQ(open("a.sub", "{1}{2}a\n{3"), QvStatus::cannotParse);
    EXPECT_NE(std::string(decoder.errorDesc()).find("a.sub: what follows subtitle 1"), std::string::npos);
    EXPECT_EQ(open("a.srt", std::string("\0\0\1", 3)), QvStatus::cannotParse);
    decoder.setParam("filename", folder.file("none.srt").c_str());
    EXPECT_EQ(decoder.open(), QvStatus::cannotParse);
    LogCapture log;
    EXPECT_EQ(open("a.srt", std::string(srt) + "3\nno times\n\nmore\n"), 0);
    EXPECT_TRUE(log.contains("the last 15 bytes of its text are not read", QvLogMask::warning));
    EXPECT_EQ(decoder.getSubpicParam(0, "unread"), 15LL);
}

}  // namespace
