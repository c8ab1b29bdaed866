// What the commands of the tool are called and take, as plain texts: the source of the completions of shells
// and of the man page.
#pragma once

#include <string>
#include <vector>

struct OptionText {
    enum class Kind { flag, value, list, flagOrValue };

    std::string shortName, longName;  // "-o" and "--output"; one may be empty
    std::string help;
    std::string type;                 // what the help shows for the value; of a flagOrValue "[=TYPE]"
    std::string heading;              // of its group in the help; empty for the first one
    std::vector<std::string> values;  // the only ones that it takes; empty for any
    Kind kind = Kind::flag;
    bool required = false;

    bool takesValue() const { return kind == Kind::value || kind == Kind::list; }
};

// The words of a command that are no options.
struct ArgumentText {
    std::string name, help;
    std::vector<std::string> values;
    bool required = true, many = false;
};

struct CommandText {
    std::string name, help;
    std::vector<ArgumentText> arguments;
    std::vector<OptionText> options;
    std::vector<CommandText> commands;  // after the arguments, one of which is needed
};

// The same for a shell that knows one level: with the names of its commands as an argument, and the options
// and arguments of all of them.
CommandText flattened(const CommandText& command);

struct ToolText {
    std::string name, description, version;
    std::vector<OptionText> options;  // before the command
    std::vector<CommandText> commands;
};

// What the value of an option or an argument names, by the type that its help shows.
enum class Names { nothing, file, folder };
Names namedBy(const std::string& type);

// The script with which a shell completes the tool's command line: "bash", "zsh" or "fish".
std::string completionFor(const std::string& shell, const ToolText& tool);

// The man page, in the macros of man(7).
std::string manualOf(const ToolText& tool);
