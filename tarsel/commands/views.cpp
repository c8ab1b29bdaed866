#include <filesystem>

#include "tarsel/commands/commands.h"
#include "tarsel/commands/outputoptions.h"
#include "tarsel/host/console.h"
#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/host/signals.h"
#include "tarsel/source/source.h"
#include "tarsel/source/viewfile.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/json.h"
#include "tarsel/words/messages.h"

namespace {

namespace fs = std::filesystem;

struct Given {
    std::string file, output, layout, raw;
    std::vector<std::string> views;
    OutputOptions outputOptions;
    bool json = false;
    Signals* signals = nullptr;
};

std::string textOf(const Any& value) { return value.toString().asString(""); }

// A file that says itself what it holds is opened by that later on; of others the decoder is stored.
QvViewSetup::View viewOf(const std::string& name, const std::string& raw) {
    const bool plain = Source::describesItself(name);
    const Source source(name, plain ? "" : raw);
    QvViewSetup::View view;
    if (source.isFile()) view.file = Any(source.name().c_str());
    if (!plain || !source.isFile()) source.decoder().store(view.state);
    return view;
}

QvViewSetup setupGiven(const Given& given) {
    if (given.views.empty() && given.file.empty()) throw failure(Msg::viewNothing, {"--view"});
    if (!given.views.empty() && !given.file.empty())
        throw failure(Msg::optionsExclude, {"--view", given.file});
    QvViewSetup setup;
    if (given.views.empty()) {
        requireInput(given.file);
        bool isNone = false;
        const std::string fault = setup.load(Any(given.file.c_str()), &isNone);
        if (isNone) throw failure(Msg::viewNone, {given.file});
        if (!fault.empty()) throw failure(Msg::mixInput, {given.file, fault});
    }
    for (const std::string& name : given.views) setup.views.push_back(viewOf(name, given.raw));
    if (!given.layout.empty()) QvViewSetup::findLayout(given.layout, setup.layout);
    return setup;
}

// Names in a metafile count from its folder on: what lies in it moves with it.
void renameFiles(QvViewSetup& setup, const fs::path& folder) {
    for (QvViewSetup::View& view : setup.views) {
        if (view.file.size() == 0) continue;
        const fs::path whole = absoluteName(textOf(view.file));
        const fs::path below = whole.lexically_relative(folder);
        view.file = Any((below.empty() || *below.begin() == ".." ? whole : below).c_str());
    }
}

void write(const Given& given, QvViewSetup setup, std::vector<std::string> inputs) {
    requireNoFolder(given.output, "mmf");
    const Any extension = QvFile::getExt(Any(given.output.c_str()), true);
    if (!(extension == "mmf") && !(extension == "mvf")) throw failure(Msg::viewName, {given.output});
    if (!given.file.empty()) inputs.push_back(given.file);
    Outputs outputs(given.output, "-o", inputs, given.outputOptions.policy());
    const Signals::Watch watch(*given.signals, {.first = {}, .second = [&] { return outputs.leave(); }});
    renameFiles(setup, fs::path(absoluteName(given.output)).parent_path());
    try {
        setup.save(Any(outputs.begin(extension.asString("mmf")).c_str()));
    } catch (const QvFileException& failure) {
        throw writeFailure(given.output, outputs.withFinalNames(failure.what()));
    }
    outputs.commit();
    given.signals->complete();
    tell(Level::note, "wrote " + inQuotes(given.output));
}

void show(const QvViewSetup& setup, const QvDecodePipe& decoder, bool json) {
    Json views = Json::array();
    for (const QvViewSetup::View& view : setup.views) {
        const std::string file = textOf(view.file);
        Json entry = {{"file", file.empty() ? Json(nullptr) : Json(validUtf8(file))},
                      {"stream", view.stream}};
        if (!view.state.empty()) entry["decoder"] = validUtf8(view.state.getString("name", ""));
        views.push_back(entry);
    }
    const auto value = [&](const char* key) { return decoder.getVideoParam(0, key).asInt32(0); };
    const Json all = {{"layout", QvViewSetup::layoutName(setup.layout)},
                      {"width", value("width")},
                      {"height", value("height")},
                      {"frames", decoder.nrFrames(0)},
                      {"views_of_frame", value("nrViews")},
                      {"views", views}};
    if (json) {
        print("%s\n", all.dump(2).c_str());
        return;
    }
    print("%s, %dx%d, %d frames\n", QvViewSetup::layoutName(setup.layout), value("width"), value("height"),
          decoder.nrFrames(0));
    for (const Json& view : views)
        print("  %s stream %d\n",
              inQuotes(view[view["file"].is_null() ? "decoder" : "file"].get<std::string>()).c_str(),
              view["stream"].get<int>());
}

void views(const Given& given) {
    const QvViewSetup setup = setupGiven(given);
    const std::string what = given.file.empty() ? "--view" : "can't open " + inQuotes(given.file);
    const std::unique_ptr<QvDecodePipe> decoder = openViews(what, setup);
    if (!given.output.empty()) write(given, setup, inputFilesOf(*decoder));
    if (!given.json && !given.output.empty()) return;
    show(setup, *decoder, given.json);
    flushOutput();
}

}  // namespace

void addViews(CommandLine& line, Signals& signals) {
    Command command = line.command("views", "Describe several views of a picture in a file, or show one");
    auto given = std::make_shared<Given>();
    given->signals = &signals;
    command.argument("FILE", given->file, "Views to show or to write anew", Need::optional);
    command.list("--view", given->views, "A view: a file with a picture, once for each view", "FILE");
    command.choice("--layout", given->layout, "How they are shown (default interleaved)",
                   QvViewSetup::layoutNames());
    command.option("--raw", given->raw, "Format of raw files: size=WxH,pixel=FORMAT,rate=R", "K=V,...");
    command.option("-o,--output", given->output, "The views", "FILE.mmf");
    command.flag("--json", given->json, "Print JSON");
    given->outputOptions.add(command);
    command.action([given] { views(*given); });
}
