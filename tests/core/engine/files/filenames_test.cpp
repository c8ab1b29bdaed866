#include "core/engine/files/qvfileutil.h"
#include "tests/support/checks.h"

namespace {

// The bytes of a result, with its width checked against the argument's.
std::string text(const Any& result, bool isWide = false) {
    EXPECT_EQ(result.isWString(), isWide);
    EXPECT_TRUE(result.isText());
    return qv_os_name(result);
}

TEST(FileNames, PartsAreTheSameInBothWidths) {
    const struct {
        const char *name, *path, *file, *base, *ext, *stripped;
    } cases[] = {
        {"a.TXT", "", "a.TXT", "a", "TXT", "a"},
        {"dir.v1/a", "dir.v1/", "a", "a", "", "dir.v1/a"},
        {"/a/b.c", "/a/", "b.c", "b", "c", "/a/b"},
        {"a\\b/c.d", "a\\b/", "c.d", "c", "d", "a\\b/c"},
        {"c:file.x", "c:/", "file.x", "file", "x", "c:file"},
        {"a.", "", "a.", "a", "", "a."},
        {".", "", ".", "", "", "."},
        {".x", "", ".x", "", "x", ""},
        {"", "", "", "", "", ""},
        {"/", "/", "", "", "", "/"},
        {"d/\xC3\xA9\xFF.y", "d/", "\xC3\xA9\xFF.y", "\xC3\xA9\xFF", "y", "d/\xC3\xA9\xFF"},
    };
    for (const auto& c : cases) {
        for (const bool isWide : {false, true}) {
            const Any name = isWide ? wide(c.name) : Any(c.name);
            EXPECT_EQ(text(QvFile::getPath(name), isWide), c.path) << c.name;
            EXPECT_EQ(text(QvFile::getFilename(name), isWide), c.file) << c.name;
            EXPECT_EQ(text(QvFile::getBasename(name), isWide), c.base) << c.name;
            EXPECT_EQ(text(QvFile::getExt(name, false), isWide), c.ext) << c.name;
            EXPECT_EQ(text(QvFile::stripExt(name), isWide), c.stripped) << c.name;
        }
    }
    EXPECT_EQ(text(QvFile::getExt(wide("a.TxT\xC3\x89"), true)), "txt\xC3\x89");
}

TEST(FileNames, JoiningTakesTheFirstSeparatorThatAppears) {
    const struct {
        AnyVector parts;
        const char* joined;
        bool isWide = false;
    } cases[] = {
        {AnyVector("a/", "/b"), "a/b"},
        {AnyVector("a", "b\\c", "d"), "a\\b\\c\\d"},
        {AnyVector("/", "a"), "/a"},
        {AnyVector("", "/a", "b"), "/a/b"},
        {AnyVector("a", 7, "b"), "a/b"},
        {AnyVector("", ""), ""},
        {AnyVector("a", u"\u00e9"), "a/\xC3\xA9", true},
        {AnyVector(u"a", "\xFF"), "a/\xFF", true},
    };
    for (const auto& c : cases) EXPECT_EQ(text(QvFile::joinPath(c.parts), c.isWide), c.joined);
}

TEST(FileNames, ExtensionsAreJoinedAndChangedInTheNamesWidth) {
    EXPECT_EQ(text(QvFile::joinExt("a.", "txt")), "a.txt");
    EXPECT_EQ(text(QvFile::changeExt("/dir.v1/a", "png")), "/dir.v1/a.png");
    EXPECT_EQ(text(QvFile::changeExt("a.b.c", "png")), "a.b.png");
    EXPECT_EQ(text(QvFile::changeExt(u"x/a.b", "c"), true), "x/a.c");
}

TEST(FileNames, AbsoluteMeansALeadingSeparatorOrADrive) {
    for (const char* name : {"/", "\\x", "c:", "ab:/c", "1:2"})
        EXPECT_TRUE(QvFile::isAbsolutePath(name) && QvFile::isAbsolutePath(wide(name))) << name;
    for (const char* name : {"a", "a/b:c", ":a", "a\\:"})
        EXPECT_FALSE(QvFile::isAbsolutePath(name) || QvFile::isAbsolutePath(wide(name))) << name;
}

TEST(FileNames, SeparatorsAreUnifiedInPlaceOnlyWhereTheyDiffer) {
    Any name = "a/b\\c", number = 3;
    EXPECT_TRUE(QvFile::setSeparator(name, '\\'));
    EXPECT_EQ(text(name), "a\\b\\c");
    EXPECT_FALSE(QvFile::setSeparator(name, '\\') || QvFile::setSeparator(number, '/'));
    EXPECT_EQ(text(QvFile::osFname("a\\b/c")), "a/b/c");
    EXPECT_EQ(text(QvFile::osFname(std::string(2000, 'x').c_str())), std::string(1023, 'x'));
}

TEST(FileNames, EscapingCoversTheFourteenAndQuotingEverything) {
    EXPECT_EQ(text(QvFile::shellEscape("|&;<>()$`\\\"' \t")),
              "\\|\\&\\;\\<\\>\\(\\)\\$\\`\\\\\\\"\\'\\ \\\t");
    EXPECT_EQ(text(QvFile::shellEscape(u"a b*"), true), "a\\ b*");
    EXPECT_EQ(text(QvFile::shellQuote("it's *")), "'it'\\''s *'");
}

}  // namespace
