// The command line: what the tool's commands take, and what was given. The only unit that knows the argument
// parser.
#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "tarsel/words/commandtext.h"

namespace CLI {
class App;
class Option;
}  // namespace CLI

enum class Need { optional, required };

class Command;

class CommandLine {
  public:
    CommandLine(const char* description, const std::string& version);
    ~CommandLine();
    CommandLine(const CommandLine&) = delete;
    CommandLine& operator=(const CommandLine&) = delete;

    // Of the tool itself, before the command; `variable` is the environment's, or null.
    void option(const char* names, std::string& to, const char* help, const char* type, const char* variable);
    void flag(const char* names, bool& to, const char* help);
    Command command(const char* name, const char* help);

    using Kind = OptionText::Kind;
    // An option as it was described.
    struct Taken {
        const CLI::Option* option;
        Kind kind;
        std::vector<std::string> values;  // the only ones that it takes; empty for any
        std::vector<std::string> offers;  // what a shell completes for a value; empty for `values`
    };

    struct Parsed {
        std::string text;                       // help, version or another text, when one was asked for
        std::function<void()> prepare, action;  // of the command otherwise; there may be nothing to prepare
    };
    // Throws Failure (usage), with near matches for an unknown name; also for a flag with a value, an option
    // without one, and an option other than a list or a flag that is given twice. Knows some commands of its
    // own, which print texts about the others: help, completion and manual.
    Parsed parse(int argc, char** argv);

    // The commands and options that were added so far.
    ToolText described() const;

  private:
    void addTexts();
    std::vector<std::string> valuesOf(const CLI::Option& option) const;
    CommandText describedCommand(const CLI::App& app) const;
    std::vector<OptionText> describedOptions(const CLI::App& app) const;

    std::unique_ptr<CLI::App> app_;
    friend class Command;
    std::vector<Taken> taken_;
    std::function<void()> prepare_, chosen_;
    std::string version_, text_, helpOf_, shell_;
};

// One command as it is described. What is given goes into the targets, which live until the command has run.
// Names are "-o,--output"; `type` is what the help shows for the value.
class Command {
  public:
    Command(CLI::App& app, CommandLine& line) : app_(app), line_(line) {}

    // The words that are no options: one, or up to `most` of them, and at least one.
    void argument(const char* name, std::string& to, const char* help, Need need = Need::required);
    // A word that is one of `values`.
    void choiceArgument(const char* name, std::string& to, const char* help,
                        const std::vector<std::string>& values, Need need = Need::required);
    void arguments(const char* name, std::vector<std::string>& to, const char* help, int most = 0,
                   Need need = Need::required);  // 0: any number

    void option(const char* names, std::string& to, const char* help, const char* type,
                Need need = Need::optional);
    // The same, with some of the values that shells offer.
    void option(const char* names, std::string& to, const char* help, const char* type,
                const std::vector<std::string>& offers);
    // One value each time that it is given.
    void list(const char* names, std::vector<std::string>& to, const char* help, const char* type);
    void choice(const char* names, std::string& to, const char* help, const std::vector<std::string>& values);
    void flag(const char* names, bool& to, const char* help);
    // With or without "=VALUE"; "true" without.
    void flagOrValue(const char* names, std::string& to, const char* help, const char* type,
                     const std::vector<std::string>& offers = {});
    // The heading in the help of the options that follow; "" ends it.
    void group(const char* heading) { group_ = heading; }

    // A command of this one, "add" in "batch LIST add": its name follows the arguments, and one is needed.
    Command command(const char* name, const char* help);

    // What runs when this command was given, once the whole line has been read; `prepare` before the engine
    // starts.
    void action(std::function<void()> run, std::function<void()> prepare = {});

  private:
    void take(CLI::Option* option, CommandLine::Kind kind, const std::vector<std::string>& values = {});

    CLI::App& app_;
    CommandLine& line_;
    std::string group_;
};
