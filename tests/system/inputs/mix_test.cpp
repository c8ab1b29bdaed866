// Mixes of sounds: made, shown, and used as inputs.
#include <sys/stat.h>

#include <nlohmann/json.hpp>

#include "tests/system/tool.h"

namespace {

class Mix : public Tool {
  protected:
    Mix() {
        makeWav("a.wav", 1000, 1, 16, 48000);
        makeWav("b.wav", 800, 2, 16, 48000);
    }
    std::vector<int> valuesOf(const std::string& file) const {
        const std::string data = wavPart(contents(file), "data");
        std::vector<int> values;
        for (size_t at = 0; at < data.size(); at += 2)
            values.push_back(static_cast<std::int16_t>(leNumber(data, at, 2)));
        return values;
    }
    std::string document(const std::string& name, const std::string& element) const {
        return folder.write(name, "<Metafile>" + element + "</Metafile>");
    }
};

TEST_F(Mix, IsMadeAndTranscoded) {
    works({"mix", "--ch", "L=a.wav*0.5+b.wav:1*0.25", "--ch", "R=b.wav:0.0*-0.5", "-o", "x.mmf"});
    works({"transcode", "x.mmf", "-o", "out.wav", "--bits", "24", "--dither", "none"});
    const std::vector<int> a = valuesOf("a.wav"), b = valuesOf("b.wav");
    const std::string data = wavPart(contents("out.wav"), "data");
    ASSERT_EQ(data.size(), 1000u * 2 * 3);
    const auto at = [&](size_t i) {
        return static_cast<int>(static_cast<std::uint32_t>(leNumber(data, i * 3, 3)) << 8) >> 8;
    };
    for (size_t t = 0; t < 1000; ++t) {
        const int left = a[t] * 128 + (t < 800 ? b[t * 2 + 1] * 64 : 0);
        // A weight is rounded up to 1/65536: -0.5 is -32767 of them.
        const int right = t < 800 ? static_cast<int>(b[t * 2] * 256LL * -32767 >> 16) : 0;
        ASSERT_EQ(at(t * 2), left) << t;
        ASSERT_EQ(at(t * 2 + 1), right) << t;
    }
    // What is not said is written with as many bits as the mix has.
    works({"transcode", "x.mmf", "-o", "plain.wav"});
    EXPECT_TRUE(wavPart(contents("plain.wav"), "data") == data);
    works({"transcode", "x.mmf", "-o", "cut.wav", "--from", "0.005", "--to", "0.015"});
    EXPECT_TRUE(wavPart(contents("cut.wav"), "data") == data.substr(240 * 6, 480 * 6));

    // Names count from the folder of the mix on, so both can move together.
    std::filesystem::create_directory(folder.file("elsewhere"));
    for (const char* name : {"a.wav", "b.wav", "x.mmf"})
        std::filesystem::rename(folder.file(name), folder.file(std::string("elsewhere/") + name));
    works({"transcode", "elsewhere/x.mmf", "-o", "moved.wav"});
    EXPECT_TRUE(contents("moved.wav") == contents("plain.wav"));
    EXPECT_THAT(works({"info", "elsewhere/x.mmf"}).out, testing::HasSubstr("48000 Hz"));
    works({"loudness", "elsewhere/x.mmf"});
    works({"mix", "elsewhere/x.mmf", "-o", "y.mmf"});
    works({"transcode", "y.mmf", "-o", "again.wav"});
    EXPECT_TRUE(contents("again.wav") == contents("plain.wav"));
}

TEST_F(Mix, IsShownAsJson) {
    works({"mix", "--ch", "L=a.wav+a.wav*0.5", "--ch", "R=b.wav:1", "-o", "x.mmf"});
    const auto json = nlohmann::json::parse(works({"mix", "x.mmf", "--json"}).out);
    EXPECT_EQ(json["samples"], 1000);
    EXPECT_EQ(json["samplerate"], 48000);
    ASSERT_EQ(json["channels"].size(), 2u);
    EXPECT_EQ(json["channels"][0]["position"], "L");
    ASSERT_EQ(json["channels"][0]["sources"].size(), 1u);
    EXPECT_EQ(json["channels"][0]["sources"][0]["weight"], 1.5);
    EXPECT_EQ(json["channels"][1]["sources"][0]["channel"], 1);
    EXPECT_THAT(works({"mix", "x.mmf"}).out, testing::HasSubstr("'b.wav' stream 0 channel 1, weight 1.000"));
    EXPECT_EQ(nlohmann::json::parse(works({"mix", "--ch", "L=a.wav", "--json"}).out)["channels"].size(), 1u);
}

TEST_F(Mix, FilesMayHaveSignsInTheirNames) {
    makeWav("c+d.wav:1", 10, 1, 16, 48000);
    std::filesystem::rename(folder.file("c+d.wav:1"), folder.file("c+d*2.wav"));
    const auto json =
        nlohmann::json::parse(works({"mix", "--ch", "M=a.wav:0+c+d*2.wav*3+b.wav:0.1*-2", "--json"}).out);
    const auto& sources = json["channels"][0]["sources"];
    ASSERT_EQ(sources.size(), 3u);
    EXPECT_EQ(sources[1]["file"], "c+d*2.wav");
    EXPECT_EQ(sources[1]["weight"], 3.0);
    EXPECT_EQ(sources[2]["weight"], -2.0);
}

// What the file would not keep is not written into it.
TEST_F(Mix, NamesAndWeightsComeBack) {
    for (const char* name : {"line\nend.wav", "tab\t.wav", "cr\r.wav", "bell\a.wav", "latin\xE4.wav",
                             "surrogate\xED\xA0\x80.wav", "none\xEF\xBF\xBF.wav"}) {
        makeWav(name, 10, 1, 16, 48000);
        fails(2, {"mix", "--ch", std::string("L=") + name, "-o", "x.mmf"}, {"'x.mmf'", "XML"});
    }
    fails(2, {"mix", "--ch", "L\nR=a.wav", "-o", "x.mmf"}, {"'x.mmf'", "XML"});
    for (const char* name : {"two  blanks .wav", " \xC3\xA4'\"&<>.wav", "back\\slash.wav", "C:\\x.wav"}) {
        makeWav(name, 10, 1, 16, 48000);
        works({"mix", "--ch", std::string("L=") + name, "-o", "x.mmf", "-y"});
        EXPECT_EQ(nlohmann::json::parse(works({"mix", "x.mmf", "--json"}).out)["samples"], 10) << name;
    }
    const struct {
        const char *weight, *warning;
    } rows[] = {{"0.333", ""},
                {"32767", ""},
                {"0.0001", "0.0001 became 0.000"},
                {"-0.33333", "-0.33333 became -0.333"}};
    for (const auto& row : rows) {
        const Outcome o = works({"mix", "--ch", std::string("L=a.wav*") + row.weight, "-o", "x.mmf", "-y"});
        EXPECT_EQ(o.err.find("warning") != std::string::npos, *row.warning != 0) << o.err;
        EXPECT_THAT(o.err, testing::HasSubstr(row.warning));
    }
}

TEST_F(Mix, AListOfMonoFilesIsAMix) {
    std::filesystem::create_directory(folder.file("sub"));
    makeWav("sub/r.wav", 1000, 1, 16, 48000);
    document("sub/mono.mmf",
             "<MonoInterleave><channels><ch src='../a.wav' pos='L'/><ch src='r.wav' "
             "pos='R'/></channels></MonoInterleave>");
    works({"transcode", "sub/mono.mmf", "-o", "out.wav", "--bits", "16", "--dither", "none"});
    const std::vector<int> l = valuesOf("a.wav"), r = valuesOf("sub/r.wav"), out = valuesOf("out.wav");
    ASSERT_EQ(out.size(), 2000u);
    for (size_t t = 0; t < 1000; ++t) ASSERT_TRUE(out[t * 2] == l[t] && out[t * 2 + 1] == r[t]) << t;
    works({"mix", "sub/mono.mmf", "-o", "mix.mmf"});
    works({"transcode", "mix.mmf", "-o", "again.wav", "--bits", "16", "--dither", "none"});
    EXPECT_TRUE(contents("again.wav") == contents("out.wav"));
}

TEST_F(Mix, InputsThatFailAreNamed) {
    const std::string source = "<AudioInterleave><channels><ch>";
    const std::string end = "</ch></channels></AudioInterleave>";
    folder.write("bad.wav", "RIFFnothing");
    makeWav("short.wav", 100, 1, 16, 48000);
    std::filesystem::resize_file(folder.file("short.wav"), 144);
    for (const char* pipe : {"pipe.wav", "pipe.mmf"}) ASSERT_EQ(mkfifo(folder.file(pipe).c_str(), 0600), 0);
    const struct {
        const char* name;
        std::string element;
        Words parts;
    } rows[] = {
        {"none.mmf",
         source + "<src file='none.wav' channel='0'/>" + end,
         {"none.mmf", "none.wav", "no such file"}},
        {"bad.mmf", source + "<src file='bad.wav' channel='0'/>" + end, {"bad.mmf", "bad.wav", "WAV"}},
        {"channel.mmf",
         source + "<src file='b.wav' channel='2'/>" + end,
         {"channel.mmf", "b.wav", "no channel 2"}},
        {"stream.mmf", source + "<src file='b.wav' stream='1' channel='0'/>" + end, {"stream number 1"}},
        {"self.mmf", source + "<src file='self.mmf' channel='0'/>" + end, {"self.mmf", "an input of itself"}},
        {"damaged.mmf", source + "<src/>" + end, {"damaged.mmf", "without 'file'"}},
        {"unnamed.mmf", source + "<src file='' channel='0'/>" + end, {"unnamed.mmf", "an empty file name"}},
        {"mono.mmf",
         "<MonoInterleave><channels><ch src=''/></channels></MonoInterleave>",
         {"mono.mmf", "names no file"}},
        {"waits.mmf",
         source + "<src file='pipe.wav' channel='0'/>" + end,
         {"waits.mmf", "pipe.wav", "no regular file"}},
        {"waits2.mmf",
         source + "<src file='pipe.mmf' channel='0'/>" + end,
         {"waits2.mmf", "pipe.mmf", "no regular file"}},
        {"other.mmf", "<Views/>", {"other.mmf", "no mix"}},
        {"open.mmf", "<Views>", {"open.mmf", "line"}},
        {"short.mmf",
         source + "<src file='short.wav' channel='0'/>" + end,
         {"short.mmf", "short.wav", "50 of 100 samples"}},
    };
    for (const auto& row : rows) {
        document(row.name, row.element);
        fails(3, {"transcode", row.name, "-o", "out.wav"}, row.parts);
    }
    for (const char* command : {"info", "loudness", "mix"}) fails(3, {command, "bad.mmf"}, {"bad.wav"});
    works({"transcode", "short.mmf", "-o", "out.wav", "--accept-partial"});
}

TEST_F(Mix, WrongUseIsRefused) {
    works({"mix", "--ch", "L=a.wav", "-o", "x.mmf"});
    const struct {
        int status;
        Words arguments, parts;
    } rows[] = {
        {2, {"mix"}, {"nothing to mix"}},
        {2, {"mix", "--ch", "a.wav"}, {"--ch", "POSITION=FILE"}},
        {2, {"mix", "--ch", "L="}, {"--ch"}},
        {2, {"mix", "--ch", "L=a.wav+"}, {"--ch"}},
        {2, {"mix", "--ch", "L=a.wav*99999"}, {"--ch", "99999"}},
        {2, {"mix", "--ch", "L=a.wav:0.999"}, {"--ch", "999"}},
        {2, {"mix", "x.mmf", "--ch", "L=a.wav"}, {"--ch", "x.mmf"}},
        {2, {"mix", "--ch", "L=a.wav", "-o", "x.wav"}, {".mmf"}},
        {3, {"mix", "--ch", "L=none.wav", "-o", "y.mmf"}, {"none.wav"}},
        {3, {"mix", "--ch", "L=a.wav:1", "-o", "y.mmf"}, {"no channel 1"}},
        {3, {"mix", "a.wav", "-o", "y.mmf"}, {"a.wav"}},
        {4, {"mix", "--ch", "L=a.wav", "-o", "x.mmf"}, {"x.mmf"}},
        {4, {"mix", "x.mmf", "-o", "x.mmf", "-y"}, {"input"}},
        {4, {"transcode", "x.mmf", "-o", "a.wav", "-y"}, {"a.wav", "input"}},
        {4, {"mix", "--ch", "L=a.wav", "-o", "none/x.mmf"}, {"none"}},
    };
    for (const auto& row : rows) fails(row.status, row.arguments, row.parts);
}

TEST_F(Mix, ASavedTaskReadsIt) {
    works({"mix", "--ch", "L=a.wav", "--ch", "R=b.wav:1", "-o", "x.mmf"});
    works({"transcode", "x.mmf", "-o", "out.wav", "--save-task", "job.xml"});
    const std::string direct = contents("out.wav");
    works({"run", "job.xml", "-y"});
    EXPECT_TRUE(contents("out.wav") == direct);
    std::filesystem::remove(folder.file("b.wav"));
    fails(3, {"run", "job.xml", "-y"}, {"b.wav"});
}

}  // namespace
