#include "core/arch/platform.h"

#include <sched.h>

#include <cstdint>
#include <cstdlib>

#include "tests/support/checks.h"

namespace {

TEST(Platform, PriorityComesBackWithoutPrivilege) {
    std::thread([] {
        const int before = sched_getscheduler(0), lowered = before == SCHED_OTHER ? SCHED_BATCH : before;
        const int former = qv_platform().lowerThreadPriority();
        qv_platform().restoreThreadPriority(qv_platform().lowerThreadPriority());
        EXPECT_EQ(sched_getscheduler(0), lowered);
        qv_platform().restoreThreadPriority(former);
        EXPECT_EQ(sched_getscheduler(0), before);
    }).join();
}

TEST(Platform, BlocksAreAlignedAndTooMuchIsNull) {
    for (const std::size_t alignment : {1u, 8u, 64u, 4096u})
        for (const std::size_t bytes : {0u, 1u, 63u, 100'001u}) {
            void* const block = qv_platform().allocate(bytes, alignment);
            EXPECT_TRUE(block && reinterpret_cast<std::uintptr_t>(block) % alignment == 0) << bytes;
            qv_platform().release(block);
        }
    EXPECT_EQ(qv_platform().allocate(std::numeric_limits<std::size_t>::max() - 5, 64), nullptr);
    qv_platform().release(nullptr);
}

TEST(Platform, CodepagesDecodeAndMarkWhatIsNotValid) {
    const struct {
        int number;
        std::string_view bytes;
        std::u32string_view text;
    } cases[] = {
        {1252, "\x80\xE9", U"\u20AC\u00E9"},
        {932, "\x83\x65\x41", U"\u30C6A"},
        {65001, "a\xFF!", U"a\uFFFD!"},
        {932, "A\x83", U"A\uFFFD"},  // cut off within a character
    };
    for (const auto& c : cases) {
        std::u32string text;
        ASSERT_TRUE(qv_platform().decodeCodepage(c.number, c.bytes, text)) << c.number;
        EXPECT_EQ(text, c.text) << c.number;
    }
    std::u32string text;
    EXPECT_FALSE(qv_platform().decodeCodepage(99999, "x", text));
    EXPECT_FALSE(qv_platform().hasCodepage(-1));
    // Longer than the converter's block, so that it is filled again.
    ASSERT_TRUE(qv_platform().decodeCodepage(1252, std::string(10'000, '\xE9'), text));
    EXPECT_EQ(text, std::u32string(10'000, U'\u00E9'));
}

TEST(Platform, LibrariesFindDependenciesInTheirOwnFolder) {
    const TempFolder temp;
    const std::string in = "cd " + qv_platform().quoteForShell(temp.path().string()) + " && ";
    temp.write("low.c", "int low(void) { return 40; }");
    temp.write("mid.c", "int low(void); int mid(void) { return low() + 1; }");
    temp.write("top.c", "int mid(void); int top(void) { return mid() + 1; }");
    const auto run = [&](const char* command) { return qv_platform().runCommand((in + command).c_str()); };
    if (run("cc -shared -fPIC -Wl,-soname,liblow-qv.so -o liblow-qv.so low.c 2>/dev/null") != 0)
        GTEST_SKIP() << "no C compiler";
    ASSERT_EQ(run("cc -shared -fPIC -Wl,-soname,libmid-qv.so -o libmid-qv.so mid.c -L. -llow-qv"), 0);
    ASSERT_EQ(run("cc -shared -fPIC -o top_plugin.so top.c -L. -lmid-qv"), 0);

    const QvLibrary top =
        qv_platform().loadLibrary(temp.file("top_plugin.so").c_str(), QvLibraryTrust::anyone);
    void* const library = top.handle;
    ASSERT_NE(library, nullptr) << top.reason;
    const auto call = reinterpret_cast<int (*)()>(qv_platform().findSymbol(library, "top"));
    ASSERT_TRUE(call && call() == 42);
    EXPECT_EQ(qv_platform().findSymbol(library, "no_such_symbol"), nullptr);
    qv_platform().unloadLibrary(library);

    // The reason names the file that is at fault, of those that load each other.
    const auto reason = [&] {
        return qv_platform().loadLibrary(temp.file("top_plugin.so").c_str(), QvLibraryTrust::anyone).reason;
    };
    temp.write("liblow-qv.so", "no library");
    EXPECT_EQ(reason(),
              "needs the library 'libmid-qv.so', which needs the library 'liblow-qv.so', which is not a "
              "shared library");
    std::filesystem::remove(temp.file("libmid-qv.so"));
    EXPECT_EQ(reason(), "needs the library 'libmid-qv.so', which is not there");
}

}  // namespace
