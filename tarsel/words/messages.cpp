#include "tarsel/words/messages.h"

#include <cassert>
#include <iterator>

namespace {

// clang-format off
constexpr Message kMessages[] = {
    // outputs
    {Msg::outputExists,       Exit::output, "can't write {file}", "it exists",                       "use -y to overwrite it"},
    {Msg::outputIsInput,      Exit::output, "can't write {file}", "it is also an input",             "give the output another name"},
    {Msg::outputFolderAbsent, Exit::output, "can't write {file}", "the folder {file} does not exist", "make the folder first"},
    {Msg::outputNotPlaced,    Exit::output, "can't write {file}", "{system}",                        "what was there before is unchanged"},
    {Msg::outputTorn,         Exit::output, "can't write {file}", "{system}, and the files that it replaces could not all be put back", "'tarsel recover {text}' finishes it when the reason is gone"},
    {Msg::outputNotSynced,    Exit::output, "can't write {file}", "the disk did not take it ({system})", "check the disk; what was there before is unchanged"},
    {Msg::setCompleted,       Exit::done,   "completed what an ended run had begun", "{text} in {file} are the new ones", ""},
    {Msg::setRestored,        Exit::done,   "took back what an ended run had begun", "{text} in {file} are the old ones", ""},
    {Msg::leftRemoved,        Exit::done,   "removed what an ended run left", "{text}, {text}", ""},
    {Msg::workInUse,          Exit::done,   "left {file} alone", "the run that writes there is at work", ""},
    {Msg::workNotOurs,        Exit::failed, "left {file} alone", "it belongs to another user, or others may write into it", "its owner can recover it"},
    {Msg::workElsewhere,      Exit::failed, "left {file} alone", "a run on the host {name} may be at work there", "when that run has ended, 'tarsel recover {text}' removes it"},
    {Msg::workOwnerless,      Exit::failed, "left {file} alone", "it does not say which run it belongs to", "when no run is at work there, 'tarsel recover {text}' removes it"},
    {Msg::manifestUnreadable, Exit::failed, "left {file} alone", "its manifest is damaged", "look for files to keep in it, then remove it"},
    {Msg::setInTheWay,        Exit::failed, "can't finish {file}", "{file} exists and is not of that run", "move it away, then use 'tarsel recover {text}'"},
    {Msg::workStays,          Exit::failed, "can't remove {file}", "{system}", "remove it by hand, or try 'tarsel recover' later"},
    {Msg::recoverNoFolder,    Exit::usage,  "can't recover {file}", "{system}", "give the folder that the outputs are in"},
    {Msg::recoverUnfinished,  Exit::failed, "can't recover all of {file}", "{text} stayed", "do what the lines before say"},
    {Msg::staleNoAge,         Exit::usage,  "can't use --stale {name}", "this is no age",             "use 90s, 90m, 12h, 30d or never"},

    // plug-ins; the first ones are warnings, and the engine's reason ends a sentence that begins with the file
    {Msg::pluginsAbsent,      Exit::module, "no plug-ins were loaded from {file}",    "no file '*_plugin.so' was found there", "check the folder's name"},
    {Msg::pluginUnreadable,   Exit::module, "the plug-in {file} was not loaded",      "it {system}", "check the file and its permissions, or remove it"},
    {Msg::pluginUnsafe,       Exit::module, "the plug-in {file} was not loaded",      "it {system}", "keep plug-ins where only you and root may write, or use --allow-unsafe-plugins"},
    {Msg::pluginInvalid,      Exit::module, "the plug-in {file} was not loaded",      "it {system}", "replace it by a whole one for this machine, or remove it"},
    {Msg::pluginUnresolved,   Exit::module, "the plug-in {file} was not loaded",      "it {system}", "install what it needs, or remove it"},
    {Msg::pluginUnfit,        Exit::module, "the plug-in {file} was not loaded",      "it {system}", "get a version of it that was built for this engine, or remove it"},
    {Msg::pluginFailed,       Exit::module, "the plug-in {file} was not loaded",      "it {system}", "ask its maker, or remove it"},
    {Msg::pluginEndedAll,     Exit::module, "the plug-in {file} ended the program while it was loaded", "{text}", "remove it, or get another version of it"},
    // runs
    {Msg::runOutOfMemory,     Exit::failed, "can't make {file}", "out of memory",                    "free some memory, or use smaller pictures"},
    {Msg::runHasNoThread,     Exit::failed, "can't make {file}", "no thread could be started",       "end other programs, or raise the limits (ulimit -u, ulimit -v)"},
    {Msg::toolHasNoThread,    Exit::failed, "can't start",       "no thread could be started",       "end other programs, or raise the limits (ulimit -u, ulimit -v)"},
    {Msg::runBroken,          Exit::failed, "can't make {file}", "an internal error",                "--log FILE shows where"},
    {Msg::stoppedBeforePost,  Exit::failed, "stopped before the command of --post ran", "{file} is complete", "run the command yourself if you want it"},
    {Msg::stoppedInPost,      Exit::failed, "stopped in the command of --post", "it got the signal and has ended", "{file} is complete"},
    {Msg::inputShrank,        Exit::input,  "can't use {file}",  "it became shorter while it was read, {text} of {text} bytes are left", "--accept-partial takes what is there"},
    {Msg::inputShrankTaken,   Exit::input,  "{file} became shorter while it was read", "the job was run again with the {text} of {text} bytes that are left", ""},
    // outputs that are streams
    {Msg::streamClosed,        Exit::output, "can't write {file}", "the standard output is closed",      "redirect it to a file or a pipe"},
    {Msg::streamToTerminal,    Exit::usage,  "can't write {file}", "the standard output is a terminal",  "redirect it to a file or a pipe"},
    {Msg::streamNeedsFormat,   Exit::usage,  "-o -",               "no extension says what to write",    "name it, with --format wav or --format raw"},
    {Msg::streamOfFiles,       Exit::usage,  "can't write {file}", "{text} can't be a stream",           "raw pictures and WAV can, with --format raw or --format wav"},
    {Msg::streamOfChannels,    Exit::usage,  "--split-channels",   "{file} takes one stream",            "give -o the name of a file"},
    {Msg::streamReaderGone,    Exit::output, "can't write {file}", "the reader has closed the pipe",     "it has a part of the output"},
    {Msg::streamShort,         Exit::check,  "{file} is not what was asked for", "it took {text} of {text} bytes", "do not use what it has"},
    {Msg::formatUnknown,       Exit::usage,  "--format",           "there is no format {name}",          "'tarsel formats' lists all{text}"},
    {Msg::outputFormatUnknown, Exit::usage,  "-o {file}",          "no output has the extension {name}", "name its format with --format, 'tarsel formats' lists all{text}"},
    {Msg::outputFormatMissing, Exit::usage,  "-o {file}",          "no extension says what to write",    "name its format with --format, 'tarsel formats' lists all"},
    {Msg::outputTwice,         Exit::usage,  "can't write {file}", "two files of this job would have this name", "give -o the extension of its format"},
};
// clang-format on

constexpr bool inOrder() {
    for (size_t i = 0; i < std::size(kMessages); ++i)
        if (kMessages[i].id != static_cast<Msg>(i)) return false;
    return std::size(kMessages) == static_cast<size_t>(Msg::count);
}
static_assert(inOrder());

std::string shown(std::string_view placeholder, std::string_view value) {
    if (placeholder == "file" || placeholder == "name") return inQuotes(value);
    return placeholder == "system" ? inLine(std::string(value)) : std::string(value);
}

using Values = std::initializer_list<std::string_view>;

// `text` with its placeholders filled from `value` on.
std::string filled(std::string_view text, Values::iterator& value, Values::iterator end) {
    std::string line;
    for (size_t at = 0; at < text.size();) {
        const size_t open = text.find('{', at);
        line += text.substr(at, open - at);
        if (open == std::string_view::npos) break;
        const size_t close = text.find('}', open);
        assert(value != end);
        line += shown(text.substr(open + 1, close - open - 1), value == end ? "" : *value++);
        at = close + 1;
    }
    return line;
}

}  // namespace

std::span<const Message> messages() { return kMessages; }

std::string lineOf(Msg id, Values values) {
    const Message& row = kMessages[static_cast<size_t>(id)];
    auto value = values.begin();
    std::string line = filled(row.what, value, values.end());
    if (*row.why) line += ": " + filled(row.why, value, values.end());
    if (*row.remedy) line += "; " + filled(row.remedy, value, values.end());
    assert(value == values.end());
    return line;
}

Failure failure(Msg id, Values values) {
    return {kMessages[static_cast<size_t>(id)].exit, lineOf(id, values)};
}
