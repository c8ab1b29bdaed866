#include "core/transcode/task/postprocess_p.h"

#include <cctype>
#include <string>
#include <vector>

#include "core/arch/platform.h"
#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/encode/qvmuxer.h"
#include "core/engine/files/qvfileutil.h"

namespace {

struct Names {
    std::vector<std::string> inputs, outputs;  // quoted for the command line
    std::string outPath, outBase;
};

std::string narrow(const Any& text) {
    const Any converted = text.isWString() ? text.toString() : text;
    return converted.isString() ? std::string(converted.asString()) : std::string();
}

std::string quoted(const Any& name) { return qv_platform().quoteForShell(narrow(QvFile::osFname(name))); }

std::string joined(const std::vector<std::string>& names) {
    std::string all;
    for (const auto& name : names) all += (all.empty() ? "" : " ") + name;
    return all;
}

AnyVector outputFiles(QvEncodePipe& pipe) {
    if (QvMuxer* muxer = pipe.getMuxer()) {
        const Any names = muxer->getParam("filenames");
        if (names.isVector() && !names.asVector().empty()) return names.asVector();
    }
    AnyVector one;
    const Any name = pipe.getFilename();
    if (name.isText()) one.append(name);
    return one;
}

void collectOutputs(QvEncodePipe& pipe, Names& names) {
    const AnyVector files = outputFiles(pipe);
    for (int i = 0; i < files.size(); ++i) names.outputs.push_back(quoted(files.at(i)));
    if (files.empty()) return;
    names.outPath = quoted(QvFile::getPath(files.at(0)));
    std::string base = narrow(QvFile::getBasename(files.at(0)));
    // Several streams of a type are numbered after a "#"; the base name is what they share.
    const bool numbered = pipe.nrVideoStreams() > 1 || pipe.nrAudioStreams() > 1;
    if (files.size() > 1 && numbered) base = base.substr(0, base.find('#'));
    names.outBase = qv_platform().quoteForShell(base);
}

// The name that a number after a placeholder means. Of "12" with three names only the "1" is the number;
// `used` is how many digits were. Without a usable number all names are meant.
std::string numbered(const std::vector<std::string>& names, const char* digits, size_t& used) {
    size_t number = 0;
    std::string found;
    used = 0;
    for (size_t i = 0; std::isdigit(static_cast<unsigned char>(digits[i])); ++i) {
        number = number * 10 + static_cast<size_t>(digits[i] - '0');
        if (number == 0 || number > names.size()) break;
        found = names[number - 1];
        used = i + 1;
    }
    return used ? found : joined(names);
}

// One pass over the command, so that a "%" inside a file name is never taken for a placeholder.
std::string replacePlaceholders(const std::string& command, const Names& names) {
    std::string result;
    for (size_t i = 0; i < command.size();) {
        const char kind = command[i] == '%' && i + 1 < command.size() ? command[i + 1] : '\0';
        size_t used = 0;
        if (kind == 'i') {
            result += numbered(names.inputs, command.c_str() + i + 2, used);
            i += 2 + used;
        } else if (kind == 'o' && command.compare(i, 3, "%op") == 0) {
            result += names.outPath;
            i += 3;
        } else if (kind == 'o' && command.compare(i, 3, "%ob") == 0) {
            result += names.outBase;
            i += 3;
        } else if (kind == 'o') {
            result += numbered(names.outputs, command.c_str() + i + 2, used);
            i += 2 + used;
        } else {
            result += command[i++];
        }
    }
    return result;
}

}  // namespace

Any qvPostprocessCommand(const Any& command, const QvDPipeList& inputs, QvEncodePipe* output) {
    if (!command.isString()) return command;
    Names names;
    for (int i = 0; i < inputs.size(); ++i)
        names.inputs.push_back(quoted(inputs.at(i)->getParam("filename")));
    if (output) collectOutputs(*output, names);
    return Any(replacePlaceholders(command.asString(), names).c_str());
}
