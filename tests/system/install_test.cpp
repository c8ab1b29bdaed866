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

TEST_F(Examples, SoundFromMemory) {
    makeWav("take.wav", 12345, 2, 24, 48000);
    const std::string program = QV_BINARY_DIR "/examples/sound_from_memory";
    const Outcome block = runProgram({program, "take.wav"}, here());
    EXPECT_EQ(block.status, 0) << block.err;
    EXPECT_THAT(block.out, HasSubstr("12345 samples, peak "));
    EXPECT_EQ(runProgram({program, "take.wav", "callbacks"}, here()).out, block.out);
    const Outcome absent = runProgram({program, "absent.wav"}, here());
    EXPECT_EQ(absent.status, 1);
    EXPECT_THAT(absent.err, HasSubstr("absent.wav: wavdec: Failed to parse WAV file"));
}

// A raw clip, a filter, progress, cancelling and causes, as docs/embedding.md shows.
TEST_F(Examples, Watermark) {
    const std::string program = QV_BINARY_DIR "/examples/watermark";
    makeYuv("clip.yuv", 20);
    works({"frame", "testgen:size=32x32", "-o", "mark.png"});
    const auto run = [&](const Words& arguments) { return runProgram(Words{program} + arguments, here()); };
    const Outcome done = run({"clip.yuv", "64x48", "mark.png", "out.avi"});
    EXPECT_EQ(done.status, 0) << done.err;
    EXPECT_THAT(done.err, HasSubstr("50 %"));
    EXPECT_THAT(tarsel({"transcode", "clip.yuv", "--raw", "size=64x48", "--logo", "mark.png@-10,10,0.8", "-o",
                        "tool.avi", "-q"})
                    .err,
                "");
    EXPECT_TRUE(contents("out.avi") == contents("tool.avi"));
    const Outcome part = run({"clip.yuv", "64x48", "mark.png", "part.avi", "0.3"});
    EXPECT_THAT(part.err, testing::AllOf(HasSubstr("cancelled"), testing::Not(HasSubstr("50 %"))));
    EXPECT_LT(size("part.avi"), size("out.avi"));
    const struct {
        Words arguments;
        const char* cause;
    } rows[] = {
        {{"clip.yuv", "64x48", "absent.png", "x.avi"},
         "Can not open transcode link: logo: The logo picture absent.png can't be opened"},
        {{"clip.yuv", "64x48", "clip.yuv", "x.avi"}, "can't be read as a PNG"},
        {{"absent.yuv", "64x48", "mark.png", "x.avi"}, "Failed to open file 'absent.yuv' using 'rawdec'."},
        {{"clip.yuv", "0x48", "mark.png", "x.avi"}, "Invalid frame size 0x"},
        {{"clip.yuv", "64x48", "mark.png", "absent/x.avi"}, "absent/x.avi"},
    };
    for (const auto& row : rows) {
        const Outcome o = run(row.arguments);
        EXPECT_EQ(o.status, 1);
        EXPECT_THAT(o.err, HasSubstr(row.cause));
    }
}

// What documents take from the tool and from examples is what these say now.
TEST_F(Examples, DocumentsAreCurrent) {
    const Outcome o =
        runProgram({"python3", std::string(kSources) + "/tests/lint/tables.py", program()}, here());
    EXPECT_EQ(o.status, 0) << o.out << o.err;
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
    // The tool adds one module to those of the library, the subtitles.
    const std::string list = runProgram({program, "--no-plugins", "modules"}, here()).out;
    const std::string modules = std::to_string(std::count(list.begin(), list.end(), '\n') - 1);
    EXPECT_THAT(byPackage.out, testing::MatchesRegex("2\\.[0-9.]+ " + modules + "\n"));
    EXPECT_THAT(TempFolder::read(folder.file("tree/share/doc/qvplugcore/modules.md")),
                HasSubstr("`animatedlogo`"));
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

TEST_F(Installed, ManualCompletionsAndChanges) {
    const std::string program = folder.file("tree/bin/tarsel"), share = folder.file("tree/share/");
    const struct {
        const char* file;
        Words made;
    } texts[] = {{"man/man1/tarsel.1", {"manual"}},
                 {"bash-completion/completions/tarsel", {"completion", "bash"}},
                 {"zsh/site-functions/_tarsel", {"completion", "zsh"}},
                 {"fish/vendor_completions.d/tarsel.fish", {"completion", "fish"}}};
    for (const auto& text : texts) {
        EXPECT_TRUE(TempFolder::read(share + text.file) == runProgram(Words{program} + text.made, here()).out)
            << text.file;
        EXPECT_GT(TempFolder::read(share + text.file).size(), 3000u) << text.file;
    }
    for (const char* file : {"CHANGELOG.md", "progress.schema.json"})
        EXPECT_TRUE(fs::exists(share + "doc/qvplugcore/" + file)) << file;
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
