#include "plugins/av/mux/unitlog.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <fstream>

#include "core/encode/qvsink.h"
#include "core/engine/modules/qvregistry.h"
#include "core/stream/qvbufstrm.h"
#include "tests/support/engine.h"
#include "tests/support/temp_folder.h"

namespace {

using av::UnitLog;
using av::UnitLogEntry;
using av::UnitLogReader;

class UnitLogs : public testing::Test {
  protected:
    TempFolder folder;
    EngineScope engine;
    const std::string file = folder.file("log");
    const std::vector<UnitLogEntry> entries = {{1, 0, 7, {1, 2, 3}, {}},
                                               {2, 1, 9, {}, std::vector<std::uint8_t>(3000, 5)},
                                               {1, 0, 0, {}, {8, 9}},
                                               {1, 0, 8, {4}, {6}}};

    void write(bool whole) const {
        const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec("filesink"));
        auto& sink = static_cast<QvSink&>(*codec);
        sink.setParam("filename", Any(file.c_str()));
        ASSERT_EQ(sink.open(), 0);
        UnitLog log(*sink.stream());
        for (const UnitLogEntry& entry : entries) EXPECT_TRUE(log.add(entry)) << log.problem();
        if (whole) {
            EXPECT_TRUE(log.finish()) << log.problem();
        }
        EXPECT_EQ(sink.close(), 0);
    }
    // The identifiers of a stream's entries, and how the file ended: "" or why it failed.
    std::pair<std::vector<unsigned>, std::string> read(int type, int number) const {
        UnitLogReader reader;
        std::vector<unsigned> found;
        if (const std::string problem = reader.open(Any(file.c_str())); !problem.empty())
            return {found, problem};
        UnitLogEntry entry;
        for (;;) switch (reader.next(type, number, entry)) {
                case UnitLogReader::Read::failed: return {found, reader.problem()};
                case UnitLogReader::Read::end: return {found, ""};
                case UnitLogReader::Read::entry:
                    found.push_back(entry.id);
                    EXPECT_TRUE(std::ranges::any_of(entries, [&](const UnitLogEntry& one) {
                        return one.type == type && one.number == number && one.id == entry.id &&
                               one.info == entry.info && one.bytes == entry.bytes;
                    }));
            }
    }
};

TEST_F(UnitLogs, GiveEachStreamItsEntries) {
    write(true);
    using Found = std::pair<std::vector<unsigned>, std::string>;
    EXPECT_EQ(read(1, 0), (Found{{7, 0, 8}, ""}));
    EXPECT_EQ(read(2, 1), (Found{{9}, ""}));
    EXPECT_EQ(read(2, 0), (Found{{}, ""}));
}

TEST_F(UnitLogs, DamageIsFoundWhereverItIs) {
    write(true);
    std::string whole;
    {
        std::ifstream in(file, std::ios::binary);
        whole.assign(std::istreambuf_iterator<char>(in), {});
    }
    const auto put = [&](const std::string& bytes) { folder.write("log", bytes); };
    for (size_t at = 0; at < whole.size(); at += at < 64 || at + 80 > whole.size() ? 1 : 97) {
        SCOPED_TRACE(at);
        put(whole.substr(0, at));
        EXPECT_NE(read(1, 0).second, "");
        std::string changed = whole;
        changed[at] = static_cast<char>(changed[at] ^ 0x41);
        put(changed);
        EXPECT_NE(read(1, 0).second, "");
    }
    put(whole + "x");
    EXPECT_EQ(read(1, 0).second, "it was changed after it was written");
    write(false);
    EXPECT_EQ(read(1, 0).second, "it ends too early");
    EXPECT_EQ(UnitLogReader().open(Any(folder.file("none").c_str())), "it can't be opened");
}

}  // namespace
