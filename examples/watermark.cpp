// Puts a logo over a raw clip and writes an AVI file: a source without a header, a filter, progress, waiting,
// cancelling, and failures with their causes.
//
//     watermark clip.yuv 352x288 logo.png out.avi [STOP]
//
// STOP, from 0 to 1, is the part of the job after which it is cancelled.
#include <cstdio>
#include <cstdlib>
#include <future>
#include <memory>
#include <string>

#include <qvplugcore/qvplugcore.h>

namespace {

// A run on a thread of its own. The callbacks come on that thread.
class Run : public QvTranscoder {
  public:
    explicit Run(double stopAt) : stopAt_(stopAt) {}
    ~Run() override { stop(); }  // before the callbacks go

    // 0, 1 if it was cancelled, or an error.
    int wait() { return result_.get_future().get(); }

    int cbProgress(double part) override {
        std::fprintf(stderr, "%3.0f %%\n", part * 100);
        if (part >= stopAt_) requestStop();  // from any thread; stop() also waits
        return 0;
    }
    void cbDone(int result) override { result_.set_value(result); }

  private:
    double stopAt_;
    std::promise<int> result_;
};

// The run says what failed. Why is known by what failed: a link for its filters, a decoder, the output.
std::string causeOf(const QvTranscoder& run, QvEncodePipe& output) {
    std::string text = run.errorDesc();
    const auto add = [&](const char* cause) {
        if (*cause && text.find(cause) == std::string::npos) text += std::string(": ") + cause;
    };
    for (int i = 0; i < run.nrLinks(); ++i) {
        add(run.getLink(i)->errorDesc());
        add(run.getLink(i)->decoder()->errorDesc());
    }
    add(output.errorDesc());
    if (const QvSink* sink = output.sink()) add(sink->stream()->ioErrorText().c_str());
    return text;
}

int fail(const std::string& text) {
    std::fprintf(stderr, "watermark: %s\n", text.c_str());
    return 1;
}

// A filter of the video: a module's name with the state that its parameters make.
AnyDict logoState(const char* file) {
    const std::unique_ptr<QvCodec> logo(qv_registry()->newCodec("logo"));
    logo->setParam("filename", file);
    logo->setParam("xpos", -10);  // from the right
    logo->setParam("ypos", 10);
    logo->setParam("alpha", 0.8);
    AnyDict state;
    logo->store(state);
    return state;
}

int watermark(const char* clip, int width, int height, const char* logo, const char* to, double stopAt) {
    // A raw file has no header. What the decoder does not take or lacks is an error, not a guess.
    const AnyDict format("FOURCC", "I420", "width", width, "height", height);
    Any error;
    const std::unique_ptr<QvDecodePipe> source(QvDecFactory::decodePipeWith(Any(clip), format, &error));
    if (!source) return fail(error.asString());

    const std::unique_ptr<QvEncodePipe> output(QvEncodePipe::create());
    output->applyPreset(QvProfile::aviRaw, 0);
    output->clearStreams();
    output->addVideoStream(Any("rawvenc"));
    QvEncoder& encoder = *output->videoEncoder(0);
    encoder.setParam("type", static_cast<int>(QvFourcc::I420));
    for (const char* name : {"width", "height", "framerate"})
        encoder.setParam(name, source->getVideoParam(0, name));
    output->setFilename(Any(to));

    FiltersState filters;
    filters.appendFilter("logo", logoState(logo));
    ProcessParams params;
    params.setFilters(filters);

    Run run(stopAt);
    run.setEncoder(output.get());
    if (run.link(source.get(), qvVideoStream, 0, 0, params) < 0) return fail(run.errorDesc());
    run.setParam("startDelay", 0);
    run.setParam("progress", AnyDict("promile", 100));
    // Failures of the start are the result of this call, and cbDone does not come.
    if (const int result = run.transcode(false); result != QvStatus::ok && result != QvStatus::warning)
        return fail(causeOf(run, *output));
    const int result = run.wait();
    if (result < 0) return fail(causeOf(run, *output));
    if (result > 0) return fail(std::string("cancelled; ") + to + " is a part");
    return 0;
}

}  // namespace

int main(int argc, char** argv) {
    int width = 0, height = 0;
    if (argc < 5 || std::sscanf(argv[2], "%dx%d", &width, &height) != 2) {
        std::fprintf(stderr, "usage: watermark CLIP WxH LOGO.png OUT.avi [STOP]\n");
        return 2;
    }
    init_wrapper(nullptr);
    int result = 1;
    try {
        result = watermark(argv[1], width, height, argv[3], argv[4], argc > 5 ? std::atof(argv[5]) : 2);
    } catch (const QvException& failure) {
        fail(failure.what());
    } catch (const std::exception& failure) {
        fail(failure.what());
    }
    cleanup_wrapper();
    return result;
}
