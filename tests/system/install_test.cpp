// The installed tree, the examples and the documents, used as a stranger uses them.
#include <sys/stat.h>

#include "tests/system/tool.h"

namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;

constexpr const char* kSources = QV_SOURCE_DIR;

class Examples : public Tool {
  protected:
    Examples() { umask(022); }  // a plug-in that a group may write is refused
};

TEST_F(Examples, CopySound) {
    makeWav("take.wav", 12345, 2, 24, 48000);
    const std::string program = QV_BINARY_DIR "/examples/copy_sound";
    const Outcome o = runProgram({program, "take.wav", "copy.wav"}, here());
    EXPECT_EQ(o.status, 0) << o.err;
    EXPECT_TRUE(wavPart(contents("take.wav"), "data") == wavPart(contents("copy.wav"), "data"));
    EXPECT_EQ(runProgram({program, "absent.wav", "x.wav"}, here()).status, 1);
}

// The example of how to add a module, through the tool: its decoder opens what nothing else does.
TEST_F(Examples, PluginThroughTheTool) {
    fs::create_directory(folder.file("plugins"));
    fs::copy_file(QV_BINARY_DIR "/plugins/pcm8_plugin.so", folder.file("plugins/pcm8_plugin.so"));
    const std::string sound = patternBytes(5000);
    folder.write("tone.pcm8", sound);
    fails(3, {"transcode", "tone.pcm8", "-o", "tone.wav"}, {"'pcm8'", "tarsel formats"});
    const Outcome o = works({"--plugins", "plugins", "transcode", "tone.pcm8", "-o", "tone.wav"});
    EXPECT_EQ(o.err, "tarsel: wrote 'tone.wav', 5000 samples\n");
    EXPECT_TRUE(wavPart(contents("tone.wav"), "data") == sound);
    EXPECT_THAT(tarsel({"--plugins", "plugins", "modules"}).out, HasSubstr("polarity"));
    EXPECT_THAT(tarsel({"--plugins", "none", "modules"}).err, HasSubstr("'none'"));
}

class Installed : public Tool {
  protected:
    Installed() {
        umask(022);
        const Outcome o =
            runProgram({"cmake", "--install", QV_BINARY_DIR, "--prefix", folder.file("tree")}, here());
        EXPECT_EQ(o.status, 0) << o.err;
    }
    static Words flags() { return *QV_SANITIZE ? Words{"-fsanitize=" QV_SANITIZE} : Words(); }
    std::string configure(const std::string& source, const std::string& build,
                          const std::string& more) const {
        Words words{"cmake", "-GNinja", "-S", source, "-B", folder.file(build), more};
        words.push_back("-DCMAKE_PREFIX_PATH=" + folder.file("tree"));
        words.push_back("-DCMAKE_CXX_COMPILER=" QV_COMPILER);
        for (const auto& flag : flags()) words.push_back("-DCMAKE_CXX_FLAGS=" + flag);
        Outcome o = runProgram(words, here());
        if (o.status == 0) o = runProgram({"cmake", "--build", folder.file(build)}, here());
        return o.status == 0 ? "" : o.out + o.err;
    }

    // The first C++ block of the page, as a program.
    std::string programOfPage(const std::string& page) const {
        const std::string text = TempFolder::read(page);
        const size_t begin = text.find("```cpp\n") + 7, end = text.find("```", begin);
        std::istringstream lines(text.substr(begin, end - begin));
        std::string includes = "#include <cstdio>\n#include <memory>\n", body;
        for (std::string line; std::getline(lines, line);)
            (line.rfind("#include", 0) == 0 ? includes : body) += line + "\n";
        return includes + "int main() {\n" + body + "}\n";
    }
};

// A header that has moved is found under the name that programs have written so far.
TEST_F(Installed, HeadersUnderTheirFormerNames) {
    std::istringstream rows(TempFolder::read(std::string(kSources) + "/cmake/formerheaders.txt"));
    std::string program;
    for (std::string former, now; rows >> former;)
        if (former[0] == '#')
            std::getline(rows, former);
        else if (rows >> now)
            program += "#include <qvplugcore/" + former + ">\n";
    const std::string source = folder.write("former.cpp", program + "QvCodec* codec = nullptr;\n");
    EXPECT_THAT(program, HasSubstr("core/engine/qvcodec.h"));
    const std::string headers = "-I" + folder.file("tree/include");
    const Outcome o = runProgram(
        {QV_COMPILER, "-std=c++20", "-fsyntax-only", headers, headers + "/qvplugcore", source}, here());
    EXPECT_EQ(o.status, 0) << o.err;
}

TEST_F(Installed, ByPackageAndByPkgConfig) {
    const std::string program = folder.file("tree/bin/tarsel");
    EXPECT_THAT(runProgram({program, "--version"}, here()).out, HasSubstr("tarsel 2."));

    const std::string page =
        folder.write("embedding.cpp", programOfPage(std::string(kSources) + "/docs/embedding.md"));
    const std::string source = std::string(kSources) + "/tests/consumer";
    EXPECT_EQ(configure(source, "by_package", "-DCONSUMER_SOURCES=" + source + "/consumer.cpp;" + page), "");
    const Outcome byPackage = runProgram({folder.file("by_package/consumer")}, here());
    EXPECT_EQ(byPackage.status, 0) << byPackage.err;
    EXPECT_THAT(byPackage.out, testing::MatchesRegex("2\\.[0-9.]+ 44\n"));
    makeWav("take.wav", 777);
    EXPECT_EQ(runProgram({folder.file("by_package/embedding")}, here()).status, 0);
    EXPECT_TRUE(wavPart(contents("take.wav"), "data") == wavPart(contents("copy.wav"), "data"));

    ProcessOptions options = here();
    options.environment = {"PKG_CONFIG_PATH=" + folder.file("tree/" QV_LIBDIR "/pkgconfig")};
    std::string command = QV_COMPILER " -std=c++20 -o by_pkg_config";
    for (const auto& flag : flags()) command += " " + flag;
    command += " " + source + "/consumer.cpp $(pkg-config --cflags --libs qvplugcore) -Wl,-rpath," +
               folder.file("tree/" QV_LIBDIR);
    const Outcome compiled = runProgram({"sh", "-c", command}, options);
    ASSERT_EQ(compiled.status, 0) << compiled.err;
    EXPECT_EQ(runProgram({folder.file("by_pkg_config")}, here()).out, byPackage.out);
}

TEST_F(Installed, APluginBuiltAgainstIt) {
    EXPECT_EQ(configure(std::string(kSources) + "/examples/plugin", "plugin", "-DCMAKE_BUILD_TYPE=Debug"),
              "");
    folder.write("tone.pcm8", patternBytes(100));
    const Outcome o =
        runProgram({folder.file("tree/bin/tarsel"), "--plugins", "plugin", "info", "tone.pcm8"}, here());
    EXPECT_EQ(o.status, 0) << o.err;
    EXPECT_THAT(o.out, HasSubstr("8000 Hz, 1 ch, 8 bit, 100 samples"));
}

}  // namespace
