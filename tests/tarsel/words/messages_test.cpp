// The table of messages: each row as it would be shown, and what every row has to hold.
#include "tarsel/words/messages.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <set>

#include "tarsel/words/fixedline.h"
#include "tarsel/words/systemcause.h"

namespace {

// The values of these are a file, an option or a word of the user's.
const std::set<std::string> kNaming = {"{file}", "{name}", "{option}"};

// What needs to name neither: it is about the whole call, or names its subject itself.
const std::set<Msg> kNamesNothing = {
    Msg::commandMissing,     Msg::commandLineWrong, Msg::chainRefused, Msg::standardOutput,
    Msg::outOfMemory,        Msg::engineFailed,     Msg::systemFailed, Msg::inputMissing,
    Msg::captionsCut,        Msg::captionsLate,     Msg::leftRemoved,  Msg::toolHasNoThread,
    Msg::streamNeedsFormat,  Msg::outputMissing,    Msg::stopping,     Msg::stopped,
    Msg::stoppedWithNothing, Msg::doneUnsaid,       Msg::watchStopped, Msg::watchRunCrashed,
    Msg::watchRunSilent,
    Msg::engineWarns,  // a sentence of the engine
};

std::vector<std::string> placeholders(std::string_view text) {
    std::vector<std::string> found;
    for (size_t open = 0; (open = text.find('{', open)) != std::string_view::npos; ++open)
        found.emplace_back(text.substr(open, text.find('}', open) - open + 1));
    return found;
}

std::vector<std::string> placeholders(const Message& row) {
    std::vector<std::string> all;
    for (const char* column : {row.what, row.why, row.remedy})
        for (const auto& name : placeholders(column)) all.push_back(name);
    return all;
}

std::string_view sample(const std::string& placeholder) {
    if (placeholder == "{file}") return "clip.yuv";
    if (placeholder == "{name}") return "abc";
    if (placeholder == "{option}") return "--crop";
    if (placeholder == "{system}") return "[part] The format is unknown.\n";
    if (placeholder == "{hint}") return " Did you mean 'abd'?";
    EXPECT_EQ(placeholder, "{text}");
    return "25";
}

// A row with up to six samples.
std::string shown(const Message& row) {
    std::vector<std::string_view> v;
    for (const auto& name : placeholders(row)) v.push_back(sample(name));
    switch (v.size()) {
        case 0: return lineOf(row.id);
        case 1: return lineOf(row.id, {v[0]});
        case 2: return lineOf(row.id, {v[0], v[1]});
        case 3: return lineOf(row.id, {v[0], v[1], v[2]});
        case 4: return lineOf(row.id, {v[0], v[1], v[2], v[3]});
        case 5: return lineOf(row.id, {v[0], v[1], v[2], v[3], v[4]});
    }
    ADD_FAILURE() << row.what << ": too many values";
    return "";
}

bool names(const Message& row) {
    for (const auto& name : placeholders(row))
        if (kNaming.count(name)) return true;
    // The row is about one option, which it names.
    return std::string_view(row.what).find("--") != std::string_view::npos ||
           std::string_view(row.what).rfind("testgen", 0) == 0;
}

// How a run is at the moment: nothing is wrong, so there is no reason to give.
bool isNote(const Message& row) { return row.id == Msg::stopping || row.id == Msg::postRuns; }

void expectReadable(const std::string& line) {
    for (const char* unwanted :
         {"Qv", "::", "  ", "..", " ;", " :", "behind", "told", ".tarsel-", "[", "{", "}"})
        if (std::string_view(unwanted) != ".." || line.find("...") == std::string::npos) {
            EXPECT_EQ(line.find(unwanted), std::string::npos) << line << ": " << unwanted;
        }
    EXPECT_TRUE(line.ends_with("...") || !line.ends_with(".")) << line;
    EXPECT_NE(line.back(), ' ') << line;
    EXPECT_LE(line.size(), 160u) << line;
    EXPECT_EQ(line.find('\n'), std::string::npos) << line;
}

TEST(Messages, EachSaysWhatWhyAndWhatToDo) {
    std::set<std::string> lines;
    for (const Message& row : messages()) {
        const std::string line = shown(row);
        std::printf("%d  %s\n", static_cast<int>(row.exit), line.c_str());
        const bool warning = row.exit == Exit::done, engines = row.id == Msg::engineWarns;
        EXPECT_NE(*row.what, '\0') << line;
        EXPECT_TRUE(*row.why || engines || isNote(row)) << line;
        EXPECT_TRUE(*row.remedy || warning) << line;
        EXPECT_NE(names(row), kNamesNothing.count(row.id) > 0) << line;
        // The brackets of an option's syntax are no trace of the log.
        if (line.find("[.mmm]") == std::string::npos) expectReadable(line);
        EXPECT_TRUE(lines.insert(line).second) << "twice: " << line;
    }
}

TEST(Messages, ValuesAreShownSoThatTheyStayOnTheLine) {
    EXPECT_EQ(lineOf(Msg::outputExists, {"a\nb"}),
              "can't write 'a\\x0ab': it exists; use -y to overwrite it");
    EXPECT_EQ(lineOf(Msg::pixelUnknown, {"--pixel", "I42O", " Did you mean 'I420'?"}),
              "--pixel: there is no pixel format 'I42O'; did you mean 'I420'? 'tarsel formats' lists all");
    EXPECT_EQ(lineOf(Msg::pixelUnknown, {"--pixel", "I42O", ""}),
              "--pixel: there is no pixel format 'I42O'; 'tarsel formats' lists all");
    EXPECT_EQ(lineOf(Msg::engineWarns, {"[scc] Rate is a guess.\n"}), "rate is a guess");
    EXPECT_EQ(failure(Msg::outputExists, {"a"}).exit(), Exit::output);
}

// Without memory of its own it says the same.
TEST(Messages, AFixedLineIsTheSameLine) {
    for (const Message& row : messages()) {
        if (!placeholders(row).empty()) continue;
        EXPECT_EQ(FixedLine(row.id).text(), "tarsel: " + lineOf(row.id) + "\n");
    }
    EXPECT_EQ(
        FixedLine(Msg::pluginEndedAll, {"a\x1b[2J.so", "it crashed"}).text(),
        "tarsel: the plug-in 'a?[2J.so' ended the program while it was loaded: it crashed; remove it, or get "
        "another version of it\n");
    const std::string longest(10000, 'x');
    const FixedLine cut(Msg::outputExists, {longest});
    EXPECT_EQ(cut.text().back(), '\n');
    EXPECT_LT(cut.text().size(), longest.size());
}

TEST(Messages, ErrorsOfTheSystemHaveACauseAndARemedy) {
    for (const int error :
         {ENOENT, EACCES, EROFS, ENOSPC, EDQUOT, EFBIG, EIO, EMFILE, ENOMEM, EPIPE, 12345}) {
        const std::string line = systemFailure(Msg::outputSystem, "out.avi", error).what();
        expectReadable(line);
        EXPECT_EQ(line.rfind("can't write 'out.avi': ", 0), 0u) << line;
        EXPECT_NE(line.find("; "), std::string::npos) << line;
    }
    EXPECT_EQ(causeOf(ENOSPC).why, "the disk is full");
    // The engine ends its sentences with the system's words.
    const std::string full = std::string("Failed to write to 'x': ") + std::strerror(ENOSPC);
    EXPECT_STREQ(writeFailure("x", full).what(), systemFailure(Msg::outputSystem, "x", ENOSPC).what());
    EXPECT_STREQ(writeFailure("x", "The size is odd").what(),
                 "can't write 'x': the size is odd; choose another name or format");
}

// What a terminal would act on, and bytes that are no text, are shown as numbers; letters of any script stay.
TEST(Quotes, NamesCanNotWriteOverTheLine) {
    const std::pair<const char*, const char*> rows[] = {
        {"a\nb\x7F", "'a\\x0ab\\x7f'"},
        {"\xC2\x9B\x31m", "'\\xc2\\x9b1m'"},  // CSI in one character
        {"\xE2\x80\xAE"
         "gpj",
         "'\\xe2\\x80\\xaegpj'"},  // the direction turned round
        {"\xFF\xC3", "'\\xff\\xc3'"},
        {"\xC3\xA4\xE6\x97\xA5\xEF\xBF\xBD", "'\xC3\xA4\xE6\x97\xA5\xEF\xBF\xBD'"},
    };
    for (const auto& [text, shown] : rows) EXPECT_EQ(inQuotes(text), shown);
}

}  // namespace
