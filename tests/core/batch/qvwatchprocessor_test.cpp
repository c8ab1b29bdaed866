#include "core/batch/qvwatchprocessor.h"

#include "core/decode/decodefactory.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/measure/fourcc.h"
#include "core/preset/qvprofile.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/failing_codecs.h"
#include "tests/support/wav_bytes.h"

namespace {

namespace fs = std::filesystem;

class PromptInput : public QvWatchFolderInput {
  protected:
    bool waitForWriters(int) override { return true; }
};

class QvWatchProcessorTest : public testing::Test {
  protected:
    QvWatchProcessorTest() { fs::create_directory(folder_.file("in")); }

    static AnyDict target(const QvPreset& preset, const std::string& folder, bool subfolder = false) {
        AnyDict made = preset;
        made.set("__target__", AnyDict("outputFolder", folder.c_str(), "presetSubfolder", subfolder ? 1 : 0));
        return made;
    }
    AnyDict raw(const std::string& out, bool subfolder = false) const {
        return builtin(QvProfile::raw, out, subfolder);
    }
    AnyDict avi(const std::string& out, bool subfolder = false) const {
        return builtin(QvProfile::aviRaw, out, subfolder);
    }
    AnyDict builtin(int profile, const std::string& out, bool subfolder) const {
        QvPreset preset;
        preset.set("profile", profile);
        preset.set("custom", 0);
        preset.set("name", profile == QvProfile::raw ? "Raw" : "Avi");
        return target(preset, folder_.file(out), subfolder);
    }
    std::string wav(const std::string& name, unsigned seed) const {
        return folder_.write("in/" + name, riff(wavChunk("fmt ", wavFormat(1, 2, 48000, 16)) +
                                                wavChunk("data", patternBytes(96000, seed))));
    }
    int process(const QvWatchTask& task, int mode = QvWatchFolderInput::keep) {
        const Any moveTo = narrow(folder_.file("done"));
        EXPECT_EQ(input_.open(narrow(folder_.file("in")), mode, &moveTo), 0);
        return processor_.process(input_, task);
    }
    Texts filesIn(const std::string& folder) const {
        Texts names;
        for (const auto& file : fs::recursive_directory_iterator(folder_.file(folder)))
            if (file.is_regular_file()) names.push_back(file.path().filename().string());
        std::sort(names.begin(), names.end());
        return names;
    }

    EngineScope engine_;
    TempFolder folder_;
    PromptInput input_;
    QvWatchProcessor processor_;
};

QvWatchTask taskOf(const std::vector<AnyDict>& targets) {
    QvPresetList presets;
    for (const AnyDict& target : targets) presets.append(target);
    return QvWatchTask(presets);
}

}  // namespace

TEST_F(QvWatchProcessorTest, MakesEveryTargetOfEveryFile) {
    wav("a.wav", 1);
    wav("b.b.wav", 2);
    folder_.write("in/c.txt", "no sound at all");
    LogCapture log;
    EXPECT_EQ(process(taskOf({raw("out"), avi("out/deep", true)}), QvWatchFolderInput::move), -1);
    EXPECT_EQ(filesIn("in"), Texts{}) << "what fails is put away too";
    EXPECT_EQ(filesIn("done"), (Texts{"a.wav", "b.b.wav", "c.txt"}));
    EXPECT_EQ(filesIn("out/deep/Avi"), (Texts{"a.avi", "b.b.avi"}));
    EXPECT_EQ(filesIn("out").size(), 4u);
    int good = 0;
    for (const auto& [name, seed] : {std::pair{"a", 1u}, {"b.b", 2u}})
        for (const auto& file : fs::recursive_directory_iterator(folder_.file("out"))) {
            const std::string own = file.path().filename().string();
            if (!file.is_regular_file() || own.rfind(name, 0) != 0) continue;
            // The whole sound is in each target: the input was rewound between them.
            const std::string bytes = TempFolder::read(file.path().string()), all = patternBytes(96000, seed);
            good += bytes.find(all.substr(0, 7680)) != std::string::npos &&
                    bytes.find(all.substr(96000 - 3840)) != std::string::npos;
        }
    EXPECT_EQ(good, 4);
    for (const std::string& line :
         {"Creating output folder " + folder_.file("out") + ".", std::string("OK"),
          std::string("3 files in que for processing"), "Transcoding " + folder_.file("in/a.wav"),
          std::string("0 video streams, 1 audio streams."), "   ->" + folder_.file("out/deep/Avi/a.avi"),
          std::string("    preset:"), std::string("    Done in 0sec."),
          std::string("Watch folder processing finished, transcoded 4 files, failed 2 files")})
        EXPECT_TRUE(log.contains(line, QvLogMask::info)) << line;
    EXPECT_TRUE(log.contains("Failed to open " + folder_.file("in/c.txt"), QvLogMask::error));

    wav("d.wav", 3);
    EXPECT_EQ(process(taskOf({raw("out"), avi("out/deep", true)})), 0);
    EXPECT_TRUE(log.contains("Checking output folder " + folder_.file("out") + ", already exists OK."));
    EXPECT_EQ(process(taskOf({})), 0) << "no target is no failure";
}

TEST_F(QvWatchProcessorTest, BackslashesInANameMakeNoOtherName) {
    wav("b.wav", 1);
    wav("a\\b.wav", 2);
    EXPECT_EQ(process(taskOf({avi("out")}), QvWatchFolderInput::deleteFiles), 0);
    EXPECT_EQ(filesIn("out"), (Texts{"a_b.avi", "b.avi"}));
    EXPECT_EQ(filesIn("in"), Texts{});
}

TEST_F(QvWatchProcessorTest, ATargetThatCanNotBeMadeFailsAlone) {
    wav("a.wav", 1);
    QvPreset unknown(0x2FFFFFF, "Nothing");
    LogCapture log;
    EXPECT_EQ(
        process(taskOf({target(unknown, folder_.file("out")), avi("out"), avi("out"), AnyDict(avi("in"))})),
        -1);
    EXPECT_TRUE(log.contains("Failed to crerate encode pipe for preset Nothing", QvLogMask::error));
    EXPECT_TRUE(log.contains("    Failed to create encoder instance", QvLogMask::error));
    EXPECT_TRUE(log.contains("a.avi is the output of another target", QvLogMask::error));
    EXPECT_TRUE(log.contains("transcoded 1 files, failed 3 files"));
    EXPECT_EQ(filesIn("out"), Texts{"a.avi"});
    EXPECT_EQ(filesIn("in"), Texts{"a.wav"}) << "an output there would be the next input";
}

TEST_F(QvWatchProcessorTest, NeverWritesOverItsInput) {
    struct Named : QvWatchProcessor {
        explicit Named(const TempFolder& folder) : folder(folder) {}
        int nameOutput(QvEncodePipe& pipe, const QvWatchTask&, int target, const Any&) override {
            return pipe.setFilename(narrow(folder.file(target == 0 ? "out/hard.avi" : "out/soft.avi")));
        }
        const TempFolder& folder;
    } processor(folder_);
    const std::string name = wav("a.wav", 1), before = TempFolder::read(name);
    fs::create_directory(folder_.file("out"));
    fs::create_hard_link(name, folder_.file("out/hard.avi"));
    fs::create_symlink(name, folder_.file("out/soft.avi"));
    fs::create_directory_symlink(folder_.file("in"), folder_.file("link"));
    ASSERT_EQ(input_.open(narrow(folder_.file("in")), QvWatchFolderInput::keep), 0);
    LogCapture log;
    EXPECT_EQ(processor.process(input_, taskOf({avi("out"), avi("out")})), -1);
    EXPECT_EQ(log.count(".avi is the input", QvLogMask::error), 2);
    EXPECT_EQ(process(taskOf({avi("link")})), -1);
    EXPECT_TRUE(log.contains("link/a.avi would be in the watched folder", QvLogMask::error));
    EXPECT_EQ(TempFolder::read(name), before);
}

TEST_F(QvWatchProcessorTest, WithoutItsFoldersNothingBegins) {
    wav("a.wav", 1);
    folder_.write("file", "x");
    LogCapture log;
    EXPECT_EQ(process(taskOf({raw("out"), raw("file/below")})), -1);
    EXPECT_TRUE(log.contains("Can not create folder " + folder_.file("file/below"), QvLogMask::error));
    EXPECT_EQ(input_.nrFiles(), 1);
    for (const AnyDict& broken :
         {AnyDict(), AnyDict("__target__", 5), AnyDict("__target__", AnyDict("outputFolder", ""))}) {
        const QvWatchTask task = taskOf({broken});
        EXPECT_EQ(task.createOutputFolders(), -1);
    }
}

// One throws, one gives up, and one has an encoder for none of the input's streams.
TEST_F(QvWatchProcessorTest, TargetsFailAlone) {
    struct Failing : QvWatchProcessor {
        int nameOutput(QvEncodePipe& pipe, const QvWatchTask& task, int target, const Any& file) override {
            if (target == 0) throw std::bad_alloc();
            if (target == 1) return -5;
            if (target == 2) pipe.clearStreams();
            return QvWatchProcessor::nameOutput(pipe, task, target, file);
        }
    } processor;
    wav("a.wav", 1);
    ASSERT_EQ(input_.open(narrow(folder_.file("in")), QvWatchFolderInput::keep), 0);
    LogCapture log;
    EXPECT_EQ(processor.process(input_, taskOf({raw("x"), raw("y"), avi("w"), avi("z")})), -1);
    EXPECT_TRUE(log.contains("    Transcoding error: out of memory", QvLogMask::error));
    EXPECT_TRUE(log.contains("transcoded 1 files, failed 3 files"));
    EXPECT_EQ(filesIn("w"), Texts{});
    EXPECT_EQ(filesIn("z"), Texts{"a.avi"});
}

TEST_F(QvWatchProcessorTest, ATargetThatThrowsInMidRunFailsAlone) {
    struct Failing : QvWatchProcessor {
        int nameOutput(QvEncodePipe& pipe, const QvWatchTask& task, int target, const Any& file) override {
            outputs.failAt = target == 0 ? "rawaenc.write" : "";
            return QvWatchProcessor::nameOutput(pipe, task, target, file);
        }
        FailingOutputs outputs;
    } processor;
    const std::string name = wav("a.wav", 1), before = TempFolder::read(name);
    for (const auto how : {FailingOutputs::noMemory, FailingOutputs::assertion}) {
        processor.outputs.how = how;
        ASSERT_EQ(input_.open(narrow(folder_.file("in")), QvWatchFolderInput::keep), 0);
        LogCapture log;
        EXPECT_EQ(processor.process(input_, taskOf({avi("w"), avi("z")})), -1);
        EXPECT_TRUE(log.contains("    Transcoding error", QvLogMask::error));
        EXPECT_TRUE(log.contains("transcoded 1 files, failed 1 files"));
        EXPECT_GT(fs::file_size(folder_.file("z/a.avi")), 96000u);
        EXPECT_EQ(TempFolder::read(name), before);
        fs::remove(folder_.file("z/a.avi"));
    }
}

TEST_F(QvWatchProcessorTest, NamesOutputs) {
    QvPreset odd(QvProfile::raw, "x/..\\y");
    QvPreset dots(QvProfile::raw, "..");
    const QvWatchTask task =
        taskOf({raw("out"), raw("out", true), target(odd, "/o", true), target(dots, "/o", true)});
    EXPECT_EQ(task.outputFilename(0, narrow("/in/a.b.wav"), "mov"), narrow(folder_.file("out/a.b.mov")));
    EXPECT_EQ(task.outputFilename(1, narrow("/in/a"), "mov"), narrow(folder_.file("out/Raw/a.mov")));
    EXPECT_EQ(task.outputFilename(2, narrow("a.wav"), "mov"), narrow("/o/x_.._y/a.mov"));
    EXPECT_EQ(task.outputFilename(3, narrow("a.wav"), "mov"), narrow("/o/_../a.mov"));
    EXPECT_EQ(task.outputFilename(0, narrow("C:\\in\\a.wav"), "mov"), narrow(folder_.file("out/a.mov")));
    EXPECT_TRUE(task.outputFilename(0, wide("/in/\xC3\xA4.wav"), "mov").isWString());
    EXPECT_THROW(task.outputFilename(4, narrow("a"), "b"), QvAssertFailure);
}

TEST_F(QvWatchProcessorTest, EncodersFollowInputAndPreset) {
    const std::string film = folder_.write("film.yuv", std::string(32 * 16 * 3 / 2 * 5, 'x'));
    const std::unique_ptr<QvDecodePipe> decoder(QvDecFactory::decodePipeWith(
        narrow(film),
        AnyDict("FOURCC", "I420", "width", 32, "height", 16, "framerate", QvFramerate::f25p())));
    ASSERT_TRUE(decoder);
    QvPreset custom(QvProfile::aviRaw, "Mine");
    const struct {
        AnyDict preset;
        Any pal;
        bool set;
    } rows[] = {{avi("out"), Any(0), true},
                {avi("out"), Any(1), false},
                {avi("out"), Any(), false},
                {avi("out"), Any("0"), false},
                {target(custom, "out"), Any(0), false}};
    for (const auto& row : rows) {
        AnyDict preset = row.preset;
        if (row.pal.isValid()) preset.get("__target__").asDict().set("pal", row.pal);
        LogCapture log;
        const std::unique_ptr<QvEncodePipe> pipe(taskOf({preset}).createEncoder(0, decoder.get()));
        ASSERT_TRUE(pipe);
        EXPECT_EQ(pipe->nrVideoStreams(), 1);
        EXPECT_EQ(pipe->nrAudioStreams(), 0);
        EXPECT_FALSE(pipe->getFilename().isTrue());
        EXPECT_EQ(log.contains("setting NTSC mode", QvLogMask::info), row.set);
        EXPECT_FALSE(log.contains("setting PAL mode"));
    }
}

// The settings of a user's preset are those of the streams that are added.
TEST_F(QvWatchProcessorTest, StreamsHaveTheSettingsOfTheirPreset) {
    const std::unique_ptr<QvEncodePipe> source(QvEncodePipe::create());
    ASSERT_EQ(source->applyPreset(QvProfile::aviRaw, 0), 0);
    ASSERT_EQ(source->audioEncoder(0)->setParam("samplerate", 22050), 0);
    AnyDict stored;
    source->storePreset(stored);
    stored.set("name", "Mine");
    stored.set("custom", 1);
    const QvPreset mine(stored);
    wav("a.wav", 1);
    EXPECT_EQ(process(taskOf({target(mine, folder_.file("out"), true)})), 0);
    const std::unique_ptr<QvDecodePipe> decoder(QvDecFactory::decodePipe(narrow(folder_.file("in/a.wav"))));
    const std::unique_ptr<QvEncodePipe> pipe(
        taskOf({target(mine, folder_.file("out"), true)}).createEncoder(0, decoder.get()));
    ASSERT_TRUE(pipe);
    Any rate;
    pipe->audioEncoder(0)->getParam("samplerate", rate);
    EXPECT_EQ(rate, 22050);
    EXPECT_EQ(pipe->nrStreams(), 1);
    EXPECT_EQ(filesIn("out/Mine"), Texts{"a.avi"});
}
