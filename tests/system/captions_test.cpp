// Caption files, shown.
#include "tests/system/tool.h"

namespace {

class Captions : public Tool {};

TEST_F(Captions, LinesOfBothFieldsInTheOrderOfTime) {
    const std::string header = "Scenarist_SCC V1.0\r\n\r\n";
    folder.write("a.scc", header + "01:00:00;29\t9420 9420 94d0 c8e9 a180 942f\r\n\r\n01:00:10;02\t942c\r\n");
    folder.write("b.scc", header + "01:00:05;01\t1520 d5ee 19b7\r\n");
    const Outcome shown = tarsel({"captions", "a.scc", "b.scc"});
    EXPECT_EQ(shown.status, 0) << shown.err;
    EXPECT_EQ(shown.err, "");
    EXPECT_EQ(shown.out,
              "01:00:00;29\t1\t9420 9420 94d0 c8e9 a180 942f\tHi!\n"
              "01:00:05;01\t2\t1520 d5ee 19b7\tUn♪\n"
              "01:00:10;02\t1\t942c\t\n");
    EXPECT_THAT(tarsel({"captions", "b.scc", "--json"}).out,
                testing::AllOf(testing::HasSubstr("\"time\":\"01:00:05;01\""),
                               testing::HasSubstr("\"bytes\":\"1520 d5ee 19b7\"")));
    EXPECT_THAT(tarsel({"info", "a.scc"}).out, testing::HasSubstr("CEA-608, 29.97p DF"));
    folder.write("guess.scc", header + "00:00:00:02 9420");
    EXPECT_THAT(tarsel({"captions", "guess.scc"}).err, testing::HasSubstr("Framerate guess"));
}

TEST_F(Captions, WhatHasNoneIsRefused) {
    folder.write("text.scc", "1\n00:00:01,000 --> 00:00:02,000\nHi\n");
    folder.write("none.scc", "Scenarist_SCC V1.0\n");
    for (const char* name : {"text.scc", "none.scc", "absent.scc"}) {
        fails(3, {"captions", name}, {name});
        fails(3, {"info", name}, {name});
    }
    fails(2, {"captions", "a.scc", "b.scc", "c.scc"}, {"captions --help"});
}

}  // namespace
