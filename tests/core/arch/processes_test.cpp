#include <csignal>

#include "tests/support/checks.h"

namespace {

int run(const std::string& command) { return qv_platform().runCommand(command.c_str()); }

TEST(Processes, ExitCodesSignalsAndFailures) {
    const struct {
        const char* command;
        int result;
    } cases[] = {
        {"true", 0},
        {"exit 255", 255},
        {"kill -9 $$", 128 + 9},
        {"/no/such/program 2>/dev/null", 127},
    };
    for (const auto& c : cases) EXPECT_EQ(run(c.command), c.result) << c.command;
}

TEST(Processes, CommandsFindAnEndedInputAndFreshSignals) {
    EXPECT_EQ(run("read line"), 1);
    const auto former = std::signal(SIGPIPE, SIG_IGN);
    EXPECT_EQ(run("kill -PIPE $$"), 128 + SIGPIPE);
    std::signal(SIGPIPE, former);
}

TEST(Processes, NoCharacterOfAQuotedNameActs) {
    const TempFolder temp;
    Texts names;
    const char* all =
        "a b|'|''|a'b'c|$HOME|`touch acted`|$(touch acted)|;touch acted|&touch acted|x\ny|[a]|{a,b}|"
        "\xFF\xFE|-n|--help";
    for (const Any& name : Any(all).split("|")) names.push_back(name.asString());
    for (int c = 1; c < 256; ++c)
        if (c != '/') names.push_back(std::string(1, static_cast<char>(c)) + "x");
    for (const std::string& name : names) {
        temp.write("seen", "");
        const std::string quoted = qv_platform().quoteForShell(name);
        ASSERT_EQ(run("cd " + temp.path().string() + " && printf %s " + quoted + " > seen"), 0) << name;
        const std::string expected = (name.front() == '-' ? "./" : "") + name;
        EXPECT_EQ(TempFolder::read(temp.file("seen")), expected);
    }
    EXPECT_FALSE(std::filesystem::exists(temp.file("acted")));
}

}  // namespace
