#include "tools/completion.h"

#include <CLI/CLI.hpp>

namespace xtok::tools {

namespace {

std::string optionWords(const CLI::App& command) {
    std::string words;
    for (const CLI::Option* option : command.get_options()) {
        for (const std::string& name : option->get_lnames()) {
            words += " --" + name;
        }
        for (const std::string& name : option->get_snames()) {
            words += " -" + name;
        }
    }
    return words;
}

}  // namespace

// Words that are no option (a device, a file) fall back to file names.
std::string bashCompletion(const CLI::App& app) {
    std::string commands;
    std::string cases;
    for (const CLI::App* command : app.get_subcommands([](const CLI::App*) { return true; })) {
        commands += " " + command->get_name();
        cases +=
            "        " + command->get_name() + ") words=\"" + optionWords(*command) + "\" ;;\n";
    }
    return "# bash completion for xtok-host: source <(xtok-host completion bash)\n"
           "_xtok_host() {\n"
           "    local current=${COMP_WORDS[COMP_CWORD]} words\n"
           "    if [[ $COMP_CWORD -eq 1 ]]; then\n"
           "        words=\"" +
           commands + optionWords(app) +
           "\"\n"
           "    else\n"
           "        case ${COMP_WORDS[1]} in\n" +
           cases +
           "        esac\n"
           "    fi\n"
           "    COMPREPLY=($(compgen -W \"$words\" -- \"$current\"))\n"
           "}\n"
           "complete -o default -F _xtok_host xtok-host\n";
}

}  // namespace xtok::tools
