#include "tarsel/words/commandline.h"

#include <algorithm>
#include <sstream>

#include <CLI/CLI.hpp>

#include "tarsel/words/failure.h"

namespace {

std::vector<std::string> commandNames(const CLI::App& app) {
    std::vector<std::string> names;
    for (const CLI::App* sub : app.get_subcommands({})) names.push_back(sub->get_name());
    return names;
}

// The parser's words for what was given too much.
std::string unexpected(const CLI::App& used, const std::vector<std::string>& known) {
    const std::vector<std::string> words = used.remaining(true);
    if (words.empty()) return "there is a word too many";
    const std::string word = words.front().substr(0, words.front().find('='));
    const bool option = word.size() > 1 && word[0] == '-';
    return std::string("unknown ") + (option ? "option " : "argument ") + inQuotes(word) + "." +
           suggestion(word, known);
}

// Wrong use: what the parser says, with near matches for an unknown option.
[[noreturn]] void wrongUse(const CLI::App& app, const CLI::ParseError& error) {
    const CLI::App* used = &app;
    for (const CLI::App* sub : app.get_subcommands()) used = sub;
    std::vector<std::string> known = used == &app ? commandNames(app) : std::vector<std::string>();
    for (const CLI::Option* option : used->get_options())
        for (const auto& name : option->get_lnames()) known.push_back("--" + name);
    std::string line;
    if (dynamic_cast<const CLI::ExtrasError*>(&error))
        line = unexpected(*used, known);
    else if (used == &app)
        line = "give a command.";
    else
        line = inLine(error.what()) + ".";
    const std::string help = used == &app ? "tarsel --help" : "tarsel " + used->get_name() + " --help";
    throw Failure(Exit::usage, line + " See '" + help + "'");
}

// The parser takes a mistyped command for a missing one.
void checkCommand(const CLI::App& app, int argc, char** argv) {
    const std::vector<std::string> known = commandNames(app);
    const auto takesValue = [&](const std::string& word) {
        const CLI::Option* option =
            word.find('=') == std::string::npos ? app.get_option_no_throw(word) : nullptr;
        return option && option->get_expected_max() > 0;
    };
    for (int i = 1; i < argc; ++i) {
        const std::string word = argv[i];
        if (word.empty()) continue;
        if (word[0] == '-') {
            if (takesValue(word)) ++i;
            continue;
        }
        if (std::find(known.begin(), known.end(), word) == known.end())
            throw Failure(Exit::usage, "there is no command " + inQuotes(word) + "." +
                                           suggestion(word, known) + " 'tarsel --help' lists all");
        return;
    }
}

}  // namespace

void Command::argument(const char* name, std::string& to, const char* help) {
    app_.add_option(name, to, help)->required();
}

void Command::arguments(const char* name, std::vector<std::string>& to, const char* help, int most) {
    CLI::Option* words = app_.add_option(name, to, help)->required();
    if (most > 0) words->expected(1, most);
}

void Command::option(const char* names, std::string& to, const char* help, const char* type, Need need) {
    CLI::Option* option = app_.add_option(names, to, help)->type_name(type)->required(need == Need::required);
    if (!group_.empty()) option->group(group_);
}

void Command::list(const char* names, std::vector<std::string>& to, const char* help, const char* type) {
    CLI::Option* option = app_.add_option(names, to, help)->type_name(type)->allow_extra_args(false);
    if (!group_.empty()) option->group(group_);
}

void Command::choice(const char* names, std::string& to, const char* help,
                     const std::vector<std::string>& values) {
    app_.add_option(names, to, help)->check(CLI::IsMember(values));
}

void Command::flag(const char* names, bool& to, const char* help) {
    CLI::Option* option = app_.add_flag(names, to, help);
    if (!group_.empty()) option->group(group_);
}

void Command::flagOrValue(const char* names, std::string& to, const char* help, const char* type) {
    CLI::Option* option = app_.add_flag(names, to, help)->type_name(type);
    if (!group_.empty()) option->group(group_);
}

void Command::action(std::function<void()> run) {
    app_.callback([chosen = chosen_, run = std::move(run)] { *chosen = run; });
}

CommandLine::CommandLine(const char* description, const std::string& version)
    : app_(std::make_unique<CLI::App>(description, "tarsel")) {
    app_->require_subcommand(1);
    app_->set_version_flag("--version", version);
}

CommandLine::~CommandLine() = default;

void CommandLine::option(const char* names, std::string& to, const char* help, const char* type,
                         const char* variable) {
    CLI::Option* option = app_->add_option(names, to, help)->type_name(type);
    if (variable) option->envname(variable);
}

void CommandLine::flag(const char* names, bool& to, const char* help) { app_->add_flag(names, to, help); }

Command CommandLine::command(const char* name, const char* help) {
    Command made(*app_->add_subcommand(name, help));
    made.chosen_ = &chosen_;
    return made;
}

CommandLine::Parsed CommandLine::parse(int argc, char** argv) {
    checkCommand(*app_, argc, argv);
    try {
        app_->parse(argc, argv);
    } catch (const CLI::Success& shown) {
        std::ostringstream text;
        app_->exit(shown, text, text);
        return {text.str(), {}};
    } catch (const CLI::ParseError& error) {
        wrongUse(*app_, error);
    }
    return {"", chosen_};
}
