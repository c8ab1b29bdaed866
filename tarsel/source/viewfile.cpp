#include "tarsel/source/viewfile.h"

#include <strings.h>

#include "tarsel/host/files.h"
#include "tarsel/source/source.h"
#include "tarsel/words/messages.h"

namespace {

constexpr int kDecoder = 2;

bool namesCardFolder(const Any& name) {
    const Any last = QvFile::getFilename(name).toString();
    const char* text = last.asString("");
    return strcasecmp(text, "CONTENTS") == 0 || strcasecmp(text, "CLIP") == 0;
}

std::unique_ptr<QvDecodePipe> makeViews() {
    auto decoder = makeCodec<QvDecodePipe>("mvmetadec", kDecoder);
    decoder->setParam("openParameters", AnyDict("extended", 1));  // of WAV files
    return decoder;
}

}  // namespace

std::unique_ptr<QvDecodePipe> openViews(const std::string& name) {
    QvViewSetup setup;
    bool isNone = false;
    const std::string fault = setup.load(Any(name.c_str()), &isNone);
    if (isNone) return nullptr;
    if (!fault.empty()) throw failure(Msg::mixInput, {name, fault});
    auto decoder = makeViews();
    decoder->setParam("filename", name.c_str());
    if (decoder->open() != QvStatus::ok) throw failure(Msg::mixInput, {name, decoder->errorDesc()});
    return decoder;
}

std::unique_ptr<QvDecodePipe> openViews(const std::string& option, const QvViewSetup& setup) {
    AnyDict state;
    setup.store(state);
    auto decoder = makeViews();
    decoder->setParam("metaState", state);
    if (decoder->open() != QvStatus::ok) throw failure(Msg::mixSources, {option, decoder->errorDesc()});
    return decoder;
}

bool isCardFolder(const std::string& name) {
    std::string folder = name;
    while (folder.size() > 1 && folder.back() == '/') folder.pop_back();
    if (!QvFile::isDir(Any(folder.c_str()))) return false;
    if (namesCardFolder(Any(folder.c_str()))) return true;
    for (const Any& entry : QvFile::ls(Any(folder.c_str()), 0))
        if (namesCardFolder(entry) && QvFile::isDir(entry)) return true;
    return false;
}

std::unique_ptr<QvDecodePipe> openCard(const std::string& folder) {
    auto decoder = makeCodec<QvDecodePipe>("p2dec", kDecoder);
    decoder->setParam("filename", folder.c_str());
    if (decoder->open() != QvStatus::ok) throw failure(Msg::cardInput, {folder, decoder->errorDesc()});
    return decoder;
}

std::vector<std::string> inputFilesOf(const QvDecodePipe& decoder) {
    std::vector<std::string> files;
    const Any list = decoder.QvCodec::getParam("inputFiles");
    if (list.isVector())
        for (const Any& file : list.asVector()) files.emplace_back(file.toString().asString(""));
    return files;
}
