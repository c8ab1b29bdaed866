// Tasks of several segments: how long they take to open, and what a join costs compared with a plain job.
// Lists of many tasks: what reading, writing and changing them costs compared with the XML alone.
#include <cstdio>
#include <cstring>
#include <fstream>
#include <memory>
#include <string>

#include "bench/ratio.h"
#include "core/batch/qvbatchlist.h"
#include "core/decode/qvdecoder.h"
#include "core/document/xmldom.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/modules/init.h"
#include "core/measure/fourcc.h"
#include "core/transcode/batch/qvbatchtask.h"
#include "core/transcode/batch/qvtaskfile.h"
#include "core/transcode/run/qvtranscoder.h"
#include "core/transcode/task/qvtaskstate.h"
#include "tests/support/temp_folder.h"
#include "tests/support/wav_bytes.h"

namespace {

constexpr int kWidth = 640, kHeight = 360, kFrames = 400, kSounds = 2;
const QvFramerate kRate = QvFramerate::f25p();

// A film with its sound, of which segments take parts.
struct Material {
    Material() {
        const std::string picture(static_cast<std::size_t>(kWidth * kHeight) * 3 / 2, 'x');
        std::ofstream out(film, std::ios::binary);
        for (int i = 0; i < kFrames; ++i) out << picture;
        for (const std::string& wav : wavs)
            folder.write(wav, riff(wavChunk("fmt ", wavFormat(1, 2, 48000, 16)) +
                                   wavChunk("data", std::string(std::size_t{kFrames} * 1920 * 4, 'x'))));
    }

    TempFolder folder;
    std::string film = folder.file("film.yuv");
    std::string wavs[kSounds] = {"a.wav", "b.wav"};
};

Any source(int type, const std::string& file, int from, int to) {
    ProcessParams params;
    params.setInOutPoints({MediaTime(from, kRate, MediaTime::defaultTimescale),
                           MediaTime(to, kRate, MediaTime::defaultTimescale)});
    return Any(AnyDict("file", file.c_str(), "stream", Any(Pair(type, 0)), "process",
                       static_cast<const AnyDict&>(params)));
}

AnyDict nullOutput() {
    const std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    pipe->clearStreams();
    pipe->setMuxer("nullmux");
    pipe->addVideoStream("rawvenc");
    pipe->videoEncoder(0)->setParamDict(AnyDict("type", static_cast<int>(QvFourcc::I420), "width", kWidth,
                                                "height", kHeight, "framerate", kRate));
    for (int i = 0; i < kSounds; ++i) {
        pipe->addAudioStream("rawaenc");
        pipe->audioEncoder(i)->setParamDict(AnyDict("channels", 2, "bitsPerSample", 16, "samplerate", 48000));
    }
    AnyDict encoder;
    pipe->store(encoder);
    return encoder;
}

// Segments of that many frames each, one after the other and again from the start.
QvTaskState taskOf(const Material& material, int segments, int frames) {
    QvTaskState state;
    state.set("encoder", nullOutput());
    AnyVector files(AnyDict(
        "filename", material.film.c_str(), "decoder",
        AnyDict("name", "rawdec", "FOURCC", "I420", "width", kWidth, "height", kHeight, "framerate", kRate)));
    for (const std::string& wav : material.wavs)
        files.append(AnyDict("filename", material.folder.file(wav).c_str()));
    state.set("files", files);
    AnyVector streams;
    for (int k = 0; k <= kSounds; ++k) {
        AnyVector sources;
        for (int i = 0; i < segments; ++i) {
            const int from = i * frames % kFrames;
            const std::string file = k == 0 ? material.film : material.folder.file(material.wavs[k - 1]);
            sources.append(source(k == 0 ? 1 : 2, file, from, from + frames));
        }
        streams.append(AnyDict("type", k == 0 ? 1 : 2, "sources", sources));
    }
    state.set("streams", streams);
    return state;
}

struct OpenTask {
    explicit OpenTask(const std::string& file) {
        QvEncodePipe* made = nullptr;
        QvTaskFault fault;
        task.reset(QvTaskFile::open(file.c_str(), decoders, &made, nullptr, &fault));
        pipe.reset(made);
        if (!task) std::printf("%s: %s\n", fault.path.c_str(), fault.reason.c_str());
    }
    ~OpenTask() {
        task.reset();
        pipe.reset();
        decoders.deleteAll();
    }
    void run() {
        QvTranscoder transcoder(task.get());
        transcoder.setParam("startDelay", 0);
        if (const int result = transcoder.transcode(true))
            std::printf("%d %s\n", result, transcoder.errorDesc());
    }

    QvDPipeList decoders;
    std::unique_ptr<QvEncodePipe> pipe;
    std::unique_ptr<QvTask> task;
};

template <class Action>
double seconds(Action action) {
    const double before = qvBenchSeconds(QvBenchClock::thread);
    action();
    return qvBenchSeconds(QvBenchClock::thread) - before;
}

// A list of tasks of a few segments each.
void measureLists(const Material& material) {
    constexpr int tasks = 10000;
    QvRatioBench bench("lists of 10,000 tasks", QvBenchClock::thread);
    const QvTaskState one = taskOf(material, 2, 4);
    QvBatchList list;
    for (int i = 0; i < tasks; ++i) {
        QvTaskState task = one;
        task.setOutputFilename(Any((std::to_string(i) + ".avi").c_str()));
        list.append(task);
    }
    const std::string file = material.folder.file("list.xml"), plain = material.folder.file("plain.xml");
    AnyDict dict;
    list.store(dict);
    bench.compare(
        "save : the XML alone", 1.1, [&] { list.save(file.c_str()); },
        [&] { XmlParser::storeDict(plain.c_str(), dict, "BatchList", "2.0"); }, 3);
    QvBatchList read;
    bench.compare(
        "load : the XML alone", 1.1, [&] { read.load(file.c_str()); },
        [&] {
            Any name, version;
            XmlParser::restoreDict(file.c_str(), dict, name, version);
        },
        3);
    QvRatioBench::tell("save", seconds([&] { list.save(file.c_str()); }), "s");
    QvRatioBench::tell("load", seconds([&] { read.load(file.c_str()); }), "s");
    const Any last((std::to_string(tasks - 1) + ".avi").c_str());
    const double change = seconds([&] {
        read.moveTask(0, tasks - 1);
        read.setTaskEnabled(0, read.findByOutputFile(last) >= 0 && !read.hasOutputFile("new.avi"));
    });
    QvRatioBench::tell("a name looked for, a task moved and changed", change * 1000, "ms");
}

}  // namespace

int main() {
    init_wrapper(nullptr);
    const Material material;
    const auto stored = [&](const char* name, int segments, int frames) {
        const std::string file = material.folder.file(name);
        XmlParser::storeDict(file.c_str(), taskOf(material, segments, frames), "TranscodeTask", "2.0");
        return file;
    };
    {
        QvRatioBench bench("tasks of several segments", QvBenchClock::thread);
        const std::string many = stored("many.xml", 10000, 4), few = stored("few.xml", 1000, 4);
        double manySeconds = 1e9, fewSeconds = 1e9;
        for (int i = 0; i < 3; ++i) {
            manySeconds = std::min(manySeconds, seconds([&] { OpenTask task(many); }));
            fewSeconds = std::min(fewSeconds, seconds([&] { OpenTask task(few); }));
        }
        QvRatioBench::tell("10,000 segments, opened", manySeconds, "s");
        QvRatioBench::tell("a segment of 10,000 : one of 1,000", manySeconds / 10 / fewSeconds, "");
        const std::string cuts = stored("cuts.xml", 200, 2);
        QvRatioBench::tell("200 cuts, opened, a cut", seconds([&] { OpenTask task(cuts); }) * 1000 / 200,
                           "ms");

        OpenTask plain(stored("plain.xml", 1, kFrames)), joined(stored("joined.xml", 8, kFrames / 8));
        bench.compare(
            "a join of 8 segments : the same as a plain job", 1.05, [&] { joined.run(); },
            [&] { plain.run(); });
    }
    measureLists(material);
    cleanup_wrapper();
}
