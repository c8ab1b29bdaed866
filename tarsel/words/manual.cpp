// The man page.
#include "tarsel/words/commandtext.h"

namespace {

// Signs that roff takes for its own: a backslash, a hyphen that is a minus, a dot or a quote that begins a
// line.
std::string roff(const std::string& text) {
    std::string out;
    for (const char c : text) {
        if (out.empty() && (c == '.' || c == '\'')) out += "\\&";
        if (c == '\\')
            out += "\\e";
        else if (c == '-')
            out += "\\-";
        else if (c == '\'')
            out += "\\(aq";
        else
            out += c;
    }
    return out;
}

std::string bold(const std::string& text) { return "\\fB" + roff(text) + "\\fR"; }
std::string slanted(const std::string& text) { return "\\fI" + roff(text) + "\\fR"; }

std::string entry(const OptionText& option) {
    std::string head;
    for (const auto& name : {option.shortName, option.longName}) {
        if (name.empty()) continue;
        if (!head.empty()) head += ", ";
        head += bold(name);
    }
    if (option.takesValue()) head += " " + slanted(option.type);
    if (option.kind == OptionText::Kind::flagOrValue) head += slanted(option.type);
    std::string text = ".TP\n" + head + "\n" + roff(option.help);
    if (option.kind == OptionText::Kind::list) text += ". May be given more than once";
    return text + (text.ends_with("...") ? "\n" : ".\n");
}

std::string entries(const std::vector<OptionText>& options) {
    std::string text, heading;
    for (const auto& option : options) {
        if (option.heading != heading && !option.heading.empty())
            text += ".PP\n" + roff(option.heading) + ":\n";
        heading = option.heading;
        text += entry(option);
    }
    return text;
}

std::string words(const CommandText& command) {
    std::string line;
    for (const auto& argument : command.arguments) {
        const std::string word = slanted(argument.name) + (argument.many ? "..." : "");
        line += argument.required ? " " + word : " [" + word + "]";
    }
    return line;
}

// `before`: of a command within another one, that and its arguments.
std::string synopsis(const CommandText& command, const std::string& before = bold("tarsel")) {
    std::string line = before + bold(" " + command.name) + words(command);
    if (!command.commands.empty()) {
        std::string lines;
        for (const auto& one : command.commands) lines += synopsis(one, line);
        return lines;
    }
    for (const auto& option : command.options)
        if (option.longName == "--output" && option.takesValue()) {
            const std::string output = bold(option.shortName) + " " + slanted(option.type);
            line += option.required ? " " + output : " [" + output + "]";
        }
    return line + " [" + slanted("options") + "]\n";
}

constexpr struct {
    const char *status, *meaning;
} kStatus[] = {
    {"0", "done and checked"},
    {"1", "failed, or with --strict a warning"},
    {"2", "wrong use"},
    {"3", "an input can't be opened or is damaged"},
    {"4", "an output can't be written"},
    {"5", "a module is missing or can't be used"},
    {"6", "the result failed its check"},
    {"129, 130, 143", "stopped by SIGHUP, SIGINT, SIGTERM; a second signal ends the tool at once"},
};

}  // namespace

namespace {

std::string section(const CommandText& command) {
    std::string text = roff(command.help) + ".\n";
    for (const auto& argument : command.arguments)
        text += ".TP\n" + slanted(argument.name) + "\n" + roff(argument.help) + ".\n";
    return text + entries(command.options);
}

}  // namespace

std::string manualOf(const ToolText& tool) {
    std::string text = ".TH TARSEL 1 \"\" " + std::string("\"") + roff(tool.version) +
                       "\" \"User Commands\"\n.SH NAME\ntarsel \\- transcodes, inspects and draws media\n"
                       ".SH SYNOPSIS\n.nf\n";
    for (const auto& command : tool.commands) text += synopsis(command);
    text += ".fi\n.SH DESCRIPTION\n" + roff(tool.description) +
            "\nThe standard output carries data only; messages and progress go to the standard error.\n"
            ".SH OPTIONS\nBefore the command:\n" +
            entries(tool.options);
    for (const auto& command : tool.commands) {
        text += ".SH TARSEL " + roff(command.name) + "\n" + section(command);
        for (const auto& one : command.commands)
            text += ".SS " + roff(command.name) + words(command) + " " + roff(one.name) + "\n" + section(one);
    }
    text += ".SH EXIT STATUS\n";
    for (const auto& row : kStatus) text += ".TP\n" + bold(row.status) + "\n" + roff(row.meaning) + "\n";
    text += ".SH ENVIRONMENT\n.TP\n" + bold("TARSEL_PLUGINS") + "\nThe folder of plug\\-ins, unless " +
            bold("--plugins") + " names one.\n.TP\n" + bold("NO_COLOR") +
            "\nNo colours on the terminal if it is set to anything.\n";
    text += ".SH EXAMPLES\n.nf\n";
    for (const char* line :
         {"tarsel transcode testgen:size=640x360,duration=4 -o card.uyvy", "tarsel info card.wav --json",
          "tarsel transcode card.uyvy card.wav --raw size=640x360,rate=25 --from=-2 -o end.avi",
          "tarsel frame card.uyvy --raw size=640x360,rate=25 --at 1.5 -o card.png",
          "tarsel transcode card.wav --samplerate 48000 --bits 24 -o card48.wav"})
        text += roff(line) + "\n";
    return text + ".fi\n";
}
