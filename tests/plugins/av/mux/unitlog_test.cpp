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
    using Found = std::pair<std::vector<UnitLogEntry>, std::string>;

    // A stream's entries, and how the file ended: "" or why it failed.
    Found read(int type, int number) const {
        UnitLogReader reader;
        Found found;
        found.second = reader.open(Any(file.c_str()));
        if (!found.second.empty()) return found;
        UnitLogEntry entry;
        UnitLogReader::Read result;
        while ((result = reader.next(type, number, entry)) == UnitLogReader::Read::entry)
            found.first.push_back(entry);
        if (result == UnitLogReader::Read::failed) found.second = reader.problem();
        return found;
    }
};

TEST_F(UnitLogs, GiveEachStreamItsEntries) {
    write(true);
    EXPECT_EQ(read(1, 0), (Found{{entries[0], entries[2], entries[3]}, ""}));
    EXPECT_EQ(read(2, 1), (Found{{entries[1]}, ""}));
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
