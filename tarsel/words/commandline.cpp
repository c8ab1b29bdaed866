#include "tarsel/words/commandline.h"

#include <algorithm>
#include <span>
#include <sstream>

#include <CLI/CLI.hpp>

#include "tarsel/words/messages.h"

namespace {

const std::vector<std::string> kShells = {"bash", "zsh", "fish"};

std::vector<std::string> commandNames(const CLI::App& app) {
    std::vector<std::string> names;
    for (const CLI::App* sub : app.get_subcommands({})) names.push_back(sub->get_name());
    return names;
}

// "tarsel batch LIST add" of a command within one.
std::string wholeName(const CLI::App& app) {
    const CLI::App* const parent = app.get_parent();
    if (!parent) return app.get_name();
    std::string name = wholeName(*parent);
    for (const CLI::Option* option : parent->get_options())
        if (option->get_positional()) name += " " + option->get_name(true);
    return name + " " + app.get_name();
}

std::string helpOf(const CLI::App& app) { return wholeName(app) + " --help"; }

// "-o,--output" as "--output".
std::string nameOf(const CLI::Option& option) {
    if (!option.get_lnames().empty()) return "--" + option.get_lnames().front();
    return option.get_positional() ? option.get_name(true) : "-" + option.get_snames().front();
}

// What the parser could not place.
[[noreturn]] void unexpected(const CLI::App& used) {
    const std::vector<std::string> words = used.remaining(true);
    const std::string word = words.empty() ? "" : words.front().substr(0, words.front().find('='));
    if (word.size() < 2 || word[0] != '-') throw failure(Msg::wordTooMany, {word, helpOf(used)});
    std::vector<std::string> known;
    for (const CLI::Option* option : used.get_options())
        for (const auto& name : option->get_lnames()) known.push_back("--" + name);
    throw failure(Msg::optionUnknown, {word, suggestion(word, known), helpOf(used)});
}

// Wrong use, which the parser reports in words of its own.
[[noreturn]] void wrongUse(const CLI::App& app, const CLI::ParseError& error) {
    const CLI::App* used = &app;
    while (!used->get_subcommands().empty()) used = used->get_subcommands().back();
    // A mistyped option may be why another one is missing.
    if (dynamic_cast<const CLI::ExtrasError*>(&error) || (used != &app && used->remaining_size() > 0))
        unexpected(*used);
    if (used == &app && app.get_subcommands().empty()) throw failure(Msg::commandMissing);
    for (const CLI::Option* option : used->get_options())
        if (option->get_required() && option->count() == 0)
            throw failure(Msg::argumentMissing, {nameOf(*option), helpOf(*used)});
    if (const auto commands = commandNames(*used); used != &app && !commands.empty())
        throw failure(Msg::argumentMissing, {joined(commands, "|"), helpOf(*used)});
    throw failure(Msg::commandLineWrong, {helpOf(*used)});
}

// Reads the words as the parser will, for what it would accept or could not name: a value on a flag, an
// option without its value, one that is given twice.
class WordCheck {
  public:
    WordCheck(const CLI::App& app, const std::vector<CommandLine::Taken>& options)
        : app_(&app), options_(options) {}

    void run(std::span<char*> words) {
        words_ = words;
        for (at_ = 0; at_ < words_.size(); ++at_) {
            const std::string word = words_[at_];
            if (word == "--") return;
            if (word.rfind("--", 0) == 0)
                longOption(word);
            else if (word.size() > 1 && word[0] == '-')
                shortOptions(word);
            else if (!word.empty() && !app_->get_subcommands({}).empty())
                enter(word);
        }
    }

  private:
    // The parser takes a mistyped command for a missing one.
    void enter(const std::string& word) {
        const auto named = [&](const CLI::App* sub) { return sub->get_name() == word; };
        const auto commands = app_->get_subcommands(named);
        if (!commands.empty()) {
            arguments_ = 0;
            app_ = commands.front();
            return;
        }
        if (app_->get_parent() && arguments_++ < countArguments(*app_)) return;
        const auto names = commandNames(*app_);
        if (app_->get_parent())
            throw failure(Msg::choiceUnknown,
                          {wholeName(*app_), word, suggestion(word, names), joined(names)});
        throw failure(Msg::commandUnknown, {word, suggestion(word, names)});
    }

    static int countArguments(const CLI::App& app) {
        int count = 0;
        for (const CLI::Option* option : app.get_options()) count += option->get_positional() ? 1 : 0;
        return count;
    }

    const CommandLine::Taken* find(const std::string& name) const {
        const CLI::Option* option = app_->get_option_no_throw(name);
        const auto found = std::find_if(options_.begin(), options_.end(),
                                        [&](const auto& row) { return row.option == option; });
        return option && found != options_.end() ? &*found : nullptr;
    }

    void longOption(const std::string& word) {
        const size_t equals = std::min(word.find('='), word.size());
        const CommandLine::Taken* row = find(word.substr(0, equals));
        if (!row) return;
        const bool given = equals < word.size();
        const std::string value = given ? word.substr(equals + 1) : "";
        if (row->kind == CommandLine::Kind::flag) {
            if (given) throw failure(Msg::valueNotTaken, {nameOf(*row->option), value});
        } else if (row->kind != CommandLine::Kind::flagOrValue) {
            take(*row, given ? value : next());
        } else {
            if (given) needValue(*row, value);
            if (!given) checkApart(*row, word);
            count(*row);
        }
    }

    // "-qy", "-o FILE" and "-oFILE".
    void shortOptions(const std::string& word) {
        for (size_t i = 1; i < word.size(); ++i) {
            const CommandLine::Taken* row = find(std::string("-") + word[i]);
            if (!row) return;
            if (row->kind == CommandLine::Kind::flag) continue;
            return take(*row, i + 1 < word.size() ? word.substr(i + 1) : next());
        }
    }

    std::string next() { return at_ + 1 < words_.size() ? words_[++at_] : ""; }

    void take(const CommandLine::Taken& row, const std::string& value) {
        needValue(row, value);
        count(row);
        if (!row.values.empty() && std::find(row.values.begin(), row.values.end(), value) == row.values.end())
            throw failure(Msg::choiceUnknown,
                          {nameOf(*row.option), value, suggestion(value, row.values), joined(row.values)});
    }

    static void needValue(const CommandLine::Taken& row, const std::string& value) {
        if (!value.empty()) return;
        const std::string name = nameOf(*row.option), type = row.option->get_type_name();
        // The type of an option that can do without a value is "[=TYPE]".
        const bool optional = row.kind == CommandLine::Kind::flagOrValue;
        throw failure(Msg::valueMissing,
                      {name, name + "=" + (optional ? type.substr(2, type.size() - 3) : type)});
    }

    // "--deinterlace bob" would be read as an input of that name.
    void checkApart(const CommandLine::Taken& row, const std::string& option) const {
        const std::string word = at_ + 1 < words_.size() ? words_[at_ + 1] : "";
        if (std::find(row.offers.begin(), row.offers.end(), word) != row.offers.end())
            throw failure(Msg::valueApart, {option, word, option + "=" + word});
    }

    void count(const CommandLine::Taken& row) {
        if (std::find(seen_.begin(), seen_.end(), &row) != seen_.end())
            throw failure(Msg::optionRepeated, {nameOf(*row.option)});
        if (row.kind != CommandLine::Kind::list) seen_.push_back(&row);
    }

    const CLI::App* app_;
    const std::vector<CommandLine::Taken>& options_;
    std::span<char*> words_;
    size_t at_ = 0;
    int arguments_ = 0;  // of a command that has commands, so far
    std::vector<const CommandLine::Taken*> seen_;
};

}  // namespace

void Command::argument(const char* name, std::string& to, const char* help, Need need) {
    app_.add_option(name, to, help)->required(need == Need::required);
}

void Command::choiceArgument(const char* name, std::string& to, const char* help,
                             const std::vector<std::string>& values, Need need) {
    const auto known = [name, values](const std::string& word) {
        if (std::find(values.begin(), values.end(), word) == values.end())
            throw failure(Msg::choiceUnknown, {name, word, suggestion(word, values), joined(values)});
        return std::string();
    };
    line_.taken_.push_back({app_.add_option(name, to, help)->required(need == Need::required)->check(known),
                            CommandLine::Kind::value,
                            values,
                            {}});
}

void Command::arguments(const char* name, std::vector<std::string>& to, const char* help, int most,
                        Need need) {
    CLI::Option* words = app_.add_option(name, to, help)->required(need == Need::required);
    if (most > 0) words->expected(1, most);
}

void Command::take(CLI::Option* option, CommandLine::Kind kind, const std::vector<std::string>& values) {
    if (!group_.empty()) option->group(group_);
    line_.taken_.push_back({option, kind, values, {}});
}

void Command::option(const char* names, std::string& to, const char* help, const char* type, Need need) {
    CLI::Option* option = app_.add_option(names, to, help)->type_name(type)->required(need == Need::required);
    take(option, CommandLine::Kind::value);
}

void Command::option(const char* names, std::string& to, const char* help, const char* type,
                     const std::vector<std::string>& offers) {
    option(names, to, help, type);
    line_.taken_.back().offers = offers;
}

void Command::list(const char* names, std::vector<std::string>& to, const char* help, const char* type) {
    CLI::Option* option = app_.add_option(names, to, help)->type_name(type)->allow_extra_args(false);
    take(option, CommandLine::Kind::list);
}

void Command::choice(const char* names, std::string& to, const char* help,
                     const std::vector<std::string>& values) {
    CLI::Option* option = app_.add_option(names, to, help)->type_name(joined(values, "|"));
    take(option, CommandLine::Kind::value, values);
}

void Command::flag(const char* names, bool& to, const char* help) {
    take(app_.add_flag(names, to, help), CommandLine::Kind::flag);
}

void Command::flagOrValue(const char* names, std::string& to, const char* help, const char* type,
                          const std::vector<std::string>& offers) {
    take(app_.add_flag(names, to, help)->type_name(type), CommandLine::Kind::flagOrValue);
    line_.taken_.back().offers = offers;
}

Command Command::command(const char* name, const char* help) {
    app_.require_subcommand(1);
    return Command(*app_.add_subcommand(name, help), line_);
}

void Command::action(std::function<void()> run, std::function<void()> prepare) {
    app_.callback([line = &line_, run = std::move(run), prepare = std::move(prepare)] {
        line->chosen_ = run;
        line->prepare_ = prepare;
    });
}

CommandLine::CommandLine(const char* description, const std::string& version)
    : app_(std::make_unique<CLI::App>(description, "tarsel")), version_(version) {
    app_->require_subcommand(1);
    app_->set_version_flag("--version", version);
}

CommandLine::~CommandLine() = default;

void CommandLine::option(const char* names, std::string& to, const char* help, const char* type,
                         const char* variable) {
    CLI::Option* option = app_->add_option(names, to, help)->type_name(type);
    if (variable) option->envname(variable);
    taken_.push_back({option, Kind::value, {}, {}});
}

void CommandLine::flag(const char* names, bool& to, const char* help) {
    taken_.push_back({app_->add_flag(names, to, help), Kind::flag, {}, {}});
}

Command CommandLine::command(const char* name, const char* help) {
    return Command(*app_->add_subcommand(name, help), *this);
}

std::vector<OptionText> CommandLine::describedOptions(const CLI::App& app) const {
    std::vector<OptionText> all;
    for (const CLI::Option* option : app.get_options()) {
        if (option->get_positional()) continue;
        OptionText text;
        if (!option->get_snames().empty()) text.shortName = "-" + option->get_snames().front();
        if (!option->get_lnames().empty()) text.longName = "--" + option->get_lnames().front();
        text.help = option->get_description();
        if (option->get_group() != "Options") text.heading = option->get_group();
        for (const Taken& row : taken_)
            if (row.option == option) {
                text.kind = row.kind;
                text.required = option->get_required();
                text.values = row.offers.empty() ? row.values : row.offers;
                if (row.kind != Kind::flag) text.type = option->get_type_name();
            }
        all.push_back(std::move(text));
    }
    return all;
}

std::vector<std::string> CommandLine::valuesOf(const CLI::Option& option) const {
    for (const Taken& row : taken_)
        if (row.option == &option) return row.values;
    return {};
}

CommandText CommandLine::describedCommand(const CLI::App& app) const {
    CommandText command{app.get_name(), app.get_description(), {}, describedOptions(app), {}};
    for (const CLI::Option* option : app.get_options())
        if (option->get_positional())
            command.arguments.push_back({option->get_name(true), option->get_description(), valuesOf(*option),
                                         option->get_required(), option->get_expected_max() > 1});
    for (const CLI::App* sub : app.get_subcommands({})) command.commands.push_back(describedCommand(*sub));
    return command;
}

ToolText CommandLine::described() const {
    ToolText tool{app_->get_name(), app_->get_description(), version_, describedOptions(*app_), {}};
    for (const CLI::App* sub : app_->get_subcommands({})) {
        CommandText command = describedCommand(*sub);
        if (command.name == "help") command.arguments.front().values = commandNames(*app_);
        if (command.name == "completion") command.arguments.front().values = kShells;
        tool.commands.push_back(std::move(command));
    }
    return tool;
}

void CommandLine::addTexts() {
    CLI::App& help = *app_->add_subcommand("help", "Show the help of the tool, or of COMMAND");
    help.add_option("COMMAND", helpOf_, "One of the commands");
    help.callback([this] {
        const auto formatter = app_->get_formatter();
        const CLI::App* of = app_.get();
        if (!helpOf_.empty()) {
            const auto found =
                app_->get_subcommands([&](const CLI::App* sub) { return sub->get_name() == helpOf_; });
            if (found.empty())
                throw failure(Msg::commandUnknown, {helpOf_, suggestion(helpOf_, commandNames(*app_))});
            of = found.front();
        }
        const std::string name =
            of == app_.get() ? app_->get_name() : app_->get_name() + " " + of->get_name();
        text_ = formatter->make_help(of, name, CLI::AppFormatMode::Normal);
    });
    CLI::App& completion =
        *app_->add_subcommand("completion", "Print the script with which SHELL completes the command line");
    completion.add_option("SHELL", shell_, joined(kShells))->required();
    completion.callback([this] {
        if (std::find(kShells.begin(), kShells.end(), shell_) == kShells.end())
            throw failure(Msg::choiceUnknown,
                          {"SHELL", shell_, suggestion(shell_, kShells), joined(kShells)});
        text_ = completionFor(shell_, described());
    });
    app_->add_subcommand("manual", "Print the man page, for 'man -l'")->callback([this] {
        text_ = manualOf(described());
    });
}

CommandLine::Parsed CommandLine::parse(int argc, char** argv) {
    addTexts();
    WordCheck(*app_, taken_).run({argv + 1, argv + std::max(argc, 1)});
    try {
        app_->parse(argc, argv);
    } catch (const CLI::Success& shown) {
        std::ostringstream text;
        app_->exit(shown, text, text);
        return {text.str(), {}, {}};
    } catch (const CLI::ParseError& error) {
        wrongUse(*app_, error);
    }
    return {text_, prepare_, chosen_};
}
