// Scripts with which shells complete the command line.
#include <algorithm>

#include "tarsel/words/commandtext.h"
#include "tarsel/words/failure.h"

Names namedBy(const std::string& type) {
    if (type.rfind("FOLDER", 0) == 0) return Names::folder;
    return type.rfind("FILE", 0) == 0 || type.rfind("INPUT", 0) == 0 ? Names::file : Names::nothing;
}

CommandText flattened(const CommandText& command) {
    if (command.commands.empty()) return command;
    CommandText flat = command;
    flat.commands.clear();
    ArgumentText names{"COMMAND", "", {}, true, false};
    bool files = false;
    for (const CommandText& one : command.commands) {
        names.values.push_back(one.name);
        for (const ArgumentText& argument : one.arguments)
            files = files || namedBy(argument.name) == Names::file;
        for (const OptionText& option : one.options) {
            const auto same = [&](const OptionText& other) { return other.longName == option.longName; };
            if (std::none_of(flat.options.begin(), flat.options.end(), same)) flat.options.push_back(option);
        }
    }
    flat.arguments.push_back(names);
    if (files) flat.arguments.push_back({"FILE", "", {}, false, true});
    return flat;
}

namespace {

std::vector<std::string> namesOf(const OptionText& option) {
    std::vector<std::string> names;
    for (const auto& name : {option.shortName, option.longName})
        if (!name.empty()) names.push_back(name);
    return names;
}

// Within single quotes of a shell.
std::string shellQuoted(const std::string& text) {
    std::string out = "'";
    for (const char c : text) out += c == '\'' ? std::string("'\\''") : std::string(1, c);
    return out + "'";
}

std::string commandNames(const ToolText& tool) {
    std::vector<std::string> names;
    for (const auto& command : tool.commands) names.push_back(command.name);
    return joined(names, " ");
}

// --- bash

// What is offered for a value: "words=..." of a closed list, or the kind of files.
std::string bashOffer(const std::string& type, const std::vector<std::string>& values) {
    if (!values.empty()) return "words=" + shellQuoted(joined(values, " "));
    const Names names = namedBy(type);
    return names == Names::file ? "kind=files" : names == Names::folder ? "kind=folders" : "kind=none";
}

std::string bashOptions(const std::vector<OptionText>& options) {
    std::vector<std::string> all;
    std::string cases;
    for (const auto& option : options) {
        // Only its long form can have a value.
        const bool both = option.kind == OptionText::Kind::flagOrValue;
        for (const auto& name : namesOf(option)) all.push_back(name);
        if (option.takesValue())
            cases += "        " + joined(namesOf(option), "|") + ") " +
                     bashOffer(option.type, option.values) + "; return ;;\n";
        else if (both)
            cases += "        " + option.longName + ") [[ $equals ]] && { " + bashOffer("", option.values) +
                     "; return; } ;;\n";
    }
    return "        case $option in\n" + cases +
           "        esac\n        options=" + shellQuoted(joined(all, " ")) + "\n";
}

std::string bashCommand(const std::string& name, const std::vector<OptionText>& options,
                        const std::string& words) {
    return "    " + name + ")\n" + bashOptions(options) + "        " + words + "\n        ;;\n";
}

std::string bash(const ToolText& tool) {
    std::vector<std::string> valued;
    for (const auto& option : tool.options)
        if (option.takesValue())
            for (const auto& name : namesOf(option)) valued.push_back(name);
    std::string cases = bashCommand("''", tool.options, "words=" + shellQuoted(commandNames(tool)));
    for (const auto& command : tool.commands) {
        const bool any = !command.arguments.empty();
        const ArgumentText argument = any ? command.arguments.front() : ArgumentText();
        std::string offer = any ? bashOffer(argument.name, argument.values) : "kind=none";
        // A second argument is completed from its list of words, or from files.
        if (command.arguments.size() > 1 && !command.arguments[1].values.empty())
            offer += " words=" + shellQuoted(joined(command.arguments[1].values, " "));
        cases += bashCommand(command.name, command.options, offer);
    }
    return "# Completion of tarsel for bash, made by 'tarsel completion bash'.\n"
           "\n"
           "# Sets what there is to offer for the value of $option, or without one for the word itself.\n"
           "_tarsel_offer() {\n"
           "    kind=words words='' options=''\n"
           "    case $1 in\n" +
           cases +
           "    esac\n"
           "}\n"
           "\n"
           "_tarsel() {\n"
           "    local i command='' option='' prefix='' equals='' kind words options\n"
           "    local current=${COMP_WORDS[COMP_CWORD]} before=${COMP_WORDS[COMP_CWORD-1]}\n"
           "    for ((i = 1; i < COMP_CWORD; ++i)); do\n"
           "        case ${COMP_WORDS[i]} in\n"
           "        " +
           (valued.empty() ? std::string("''") : joined(valued, "|")) +
           ")\n"
           "            ((++i))\n"
           "            [[ ${COMP_WORDS[i]} == '=' ]] && ((++i))\n"
           "            ;;\n"
           "        -*|'=') ;;\n"
           "        *)\n"
           "            command=${COMP_WORDS[i]}\n"
           "            break\n"
           "            ;;\n"
           "        esac\n"
           "    done\n"
           "    # Where '=' breaks words, it is one by itself.\n"
           "    if [[ $current == '=' ]]; then\n"
           "        option=$before current='' equals=1\n"
           "    elif [[ $before == '=' ]] && ((COMP_CWORD > 2)); then\n"
           "        option=${COMP_WORDS[COMP_CWORD-2]} equals=1\n"
           "    elif [[ $current == --*=* ]]; then\n"
           "        option=${current%%=*} current=${current#*=} equals=1\n"
           "        prefix=$option=\n"
           "    elif [[ $before == -* && $current != -* ]]; then\n"
           "        option=$before\n"
           "    fi\n"
           "    _tarsel_offer \"$command\"\n"
           "    [[ -z $option && $current == -* ]] && words=$options kind=words\n"
           "    COMPREPLY=()\n"
           "    case $kind in\n"
           "    words) mapfile -t COMPREPLY < <(compgen -P \"$prefix\" -W \"$words\" -- \"$current\") ;;\n"
           "    files)\n"
           "        compopt -o filenames 2>/dev/null\n"
           "        mapfile -t COMPREPLY < <(compgen -P \"$prefix\" -f -W \"$words\" -- \"$current\")\n"
           "        ;;\n"
           "    folders)\n"
           "        compopt -o filenames 2>/dev/null\n"
           "        mapfile -t COMPREPLY < <(compgen -P \"$prefix\" -d -- \"$current\")\n"
           "        ;;\n"
           "    esac\n"
           "}\n"
           "\n"
           "complete -F _tarsel tarsel\n";
}

// --- zsh

// Colons and brackets have a meaning in the descriptions that zsh takes.
std::string escaped(const std::string& text) {
    std::string out;
    for (const char c : text) {
        if (c == '[' || c == ']' || c == ':' || c == '\\') out += '\\';
        out += c;
    }
    return out;
}

std::string zshOffer(const std::string& type, const std::vector<std::string>& values) {
    const std::string message = escaped(type.empty() ? "value" : type);
    if (!values.empty()) return message + ":(" + joined(values, " ") + ")";
    const Names names = namedBy(type);
    return message + (names == Names::file ? ":_files" : names == Names::folder ? ":_files -/" : ": ");
}

std::string zshOption(const OptionText& option) {
    std::string lines;
    for (const auto& name : namesOf(option)) {
        const bool isLong = name.size() > 2;
        std::string spec = option.kind == OptionText::Kind::list ? "*" + name : name;
        if (option.takesValue()) spec += isLong ? "=" : "+";
        if (option.kind == OptionText::Kind::flagOrValue) spec += "=-";
        spec += "[" + escaped(option.help) + "]";
        if (option.takesValue()) spec += ":" + zshOffer(option.type, option.values);
        if (option.kind == OptionText::Kind::flagOrValue)
            spec += "::" + (option.values.empty() ? escaped(option.type) + ": "
                                                  : zshOffer(option.type, option.values));
        lines += " \\\n            " + shellQuoted(spec);
    }
    return lines;
}

std::string zshArguments(const CommandText& command) {
    std::string lines;
    for (const auto& option : command.options) lines += zshOption(option);
    for (const auto& argument : command.arguments)
        lines += " \\\n            " + shellQuoted((argument.many       ? "*:"
                                                    : argument.required ? "1:"
                                                                        : "1::") +
                                                   zshOffer(argument.name, argument.values));
    return lines;
}

std::string zsh(const ToolText& tool) {
    std::string commands, cases, options;
    for (const auto& option : tool.options) options += zshOption(option);
    for (const auto& command : tool.commands) {
        commands += "            " + shellQuoted(command.name + ":" + escaped(command.help)) + "\n";
        cases += "        " + command.name + ")\n            _arguments -s" + zshArguments(command) +
                 "\n            ;;\n";
    }
    return "#compdef tarsel\n"
           "# Completion of tarsel for zsh, made by 'tarsel completion zsh'.\n"
           "\n"
           "_tarsel() {\n"
           "    local curcontext=$curcontext state line\n"
           "    typeset -A opt_args\n"
           "    _arguments -C" +
           options +
           " \\\n            '1: :->command' \\\n            '*:: :->rest'\n"
           "    case $state in\n"
           "    command)\n"
           "        local -a commands=(\n" +
           commands +
           "        )\n"
           "        _describe command commands\n"
           "        ;;\n"
           "    rest)\n"
           "        case $words[1] in\n" +
           cases +
           "        esac\n"
           "        ;;\n"
           "    esac\n"
           "}\n"
           "\n"
           "_tarsel \"$@\"\n";
}

// --- fish

std::string fishQuoted(const std::string& text) {
    std::string out = "'";
    for (const char c : text) out += c == '\'' || c == '\\' ? std::string("\\") + c : std::string(1, c);
    return out + "'";
}

std::string fishOffer(const std::string& type, const std::vector<std::string>& values) {
    if (!values.empty()) return " -x -a " + fishQuoted(joined(values, " "));
    const Names names = namedBy(type);
    if (names == Names::folder) return " -x -a '(__fish_complete_directories)'";
    return names == Names::file ? " -r -F" : " -x";
}

std::string fishOption(const OptionText& option, const std::string& condition) {
    std::string line = "complete -c tarsel -n " + fishQuoted(condition);
    if (!option.shortName.empty()) line += " -s " + option.shortName.substr(1);
    if (!option.longName.empty()) line += " -l " + option.longName.substr(2);
    if (option.takesValue()) line += fishOffer(option.type, option.values);
    if (option.kind == OptionText::Kind::flagOrValue)
        line += " -f" + (option.values.empty() ? "" : " -a " + fishQuoted(joined(option.values, " ")));
    return line + " -d " + fishQuoted(option.help) + "\n";
}

std::string fish(const ToolText& tool) {
    std::string text =
        "# Completion of tarsel for fish, made by 'tarsel completion fish'.\n"
        "\n"
        "complete -c tarsel -f\n";
    for (const auto& option : tool.options) text += fishOption(option, "__fish_use_subcommand");
    for (const auto& command : tool.commands) {
        text += "complete -c tarsel -n __fish_use_subcommand -a " + command.name + " -d " +
                fishQuoted(command.help) + "\n";
        const std::string seen = "__fish_seen_subcommand_from " + command.name;
        for (const auto& option : command.options) text += fishOption(option, seen);
        for (const auto& argument : command.arguments)
            if (!argument.values.empty() || namedBy(argument.name) != Names::nothing)
                text += "complete -c tarsel -n " + fishQuoted(seen) +
                        (argument.values.empty() && namedBy(argument.name) == Names::file
                             ? " -F"
                             : fishOffer(argument.name, argument.values).substr(3)) +
                        "\n";
    }
    return text;
}

}  // namespace

std::string completionFor(const std::string& shell, const ToolText& nested) {
    ToolText tool = nested;
    for (CommandText& command : tool.commands) command = flattened(command);
    return shell == "zsh" ? zsh(tool) : shell == "fish" ? fish(tool) : bash(tool);
}
