/* kvi-hpi-shell: HPI commands against the library hosted in this process
 * (as a daemon hosts it) or against a running kvi-hpid.
 *
 *   kvi-hpi-shell [--config FILE | --remote HOST:PORT] [-e COMMAND]... [SCRIPT]
 *
 * Interactive with neither -e nor a script; otherwise the commands run in
 * order and the first one that fails makes the exit status 1. */
#include <getopt.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>
#include <fstream>
#include <iostream>
#include <string>
#include <vector>

#ifdef KVI_SHELL_LIBEDIT
#include <editline/readline.h>
#endif

#include "HpiTable.h"
#include "Shell.h"

namespace
{

const char *const usageLine =
    "usage: kvi-hpi-shell [--config FILE | --remote HOST:PORT] [-e COMMAND]... [SCRIPT]\n";

void usage(FILE *Out)
{
    fputs(usageLine, Out);
    fputs("\n  --config FILE       host the library with this configuration (simulator.conf)\n"
          "  --remote HOST:PORT  talk to a running kvi-hpid instead\n"
          "  -e COMMAND          run COMMAND (may be given more than once)\n"
          "  --help, --version\n\ncommands (RID is a resource id or an entity path such as "
          "{SYSTEM_CHASSIS,1}):\n",
          Out);
    kviShellHelp(Out);
}

// Runs the lines of In; a failed command counts, the shell goes on.
int runLines(KviShellT &Shell, std::istream &In)
{
    int failed = 0;
    bool quit = false;
    std::string line;
    while (!quit && std::getline(In, line)) {
        printf("> %s\n", line.c_str());
        failed += !kviShellRunLine(Shell, line, &quit);
        fflush(stdout);
    }
    return failed;
}

#ifdef KVI_SHELL_LIBEDIT
KviShellT *completing = nullptr;
std::vector<std::string> candidates;

char *nextCandidate(const char *Text, int State)
{
    static size_t index;
    if (State == 0)
        index = 0;
    size_t length = strlen(Text);
    while (index < candidates.size()) {
        const std::string &word = candidates[index++];
        if (word.compare(0, length, Text) == 0)
            return strdup(word.c_str());
    }
    return nullptr;
}

// The first word completes to a command, the second to a command's second
// word, later ones to resource ids.
char **complete(const char *Text, int Start, int)
{
    std::string before(rl_line_buffer, static_cast<size_t>(Start));
    std::vector<std::string> words;
    for (size_t i = 0, end; i < before.size(); i = end + 1) {
        end = before.find(' ', i);
        if (end == std::string::npos)
            end = before.size();
        if (end > i)
            words.push_back(before.substr(i, end - i));
    }
    candidates = words.empty()       ? kviShellCommandWords("")
                 : words.size() == 1 ? kviShellCommandWords(words[0])
                                     : std::vector<std::string>();
    if (candidates.empty())
        candidates = kviShellResourceWords(*completing);
    rl_attempted_completion_over = 1;
    return rl_completion_matches(Text, nextCandidate);
}

// One line from the prompt, with history; false at the end of input.
bool promptLine(std::string *Line)
{
    char *line = readline("hpi> ");
    if (line == nullptr)
        return false;
    if (*line != '\0')
        add_history(line);
    *Line = line;
    free(line);
    return true;
}

void lineEditingSetUp(KviShellT &Shell)
{
    completing = &Shell;
    rl_attempted_completion_function = complete;
}
#else
// Without line editing (a build without libedit): plain lines.
bool promptLine(std::string *Line)
{
    fputs("hpi> ", stdout);
    fflush(stdout);
    return static_cast<bool>(std::getline(std::cin, *Line));
}

void lineEditingSetUp(KviShellT &) {}
#endif

void interactive(KviShellT &Shell)
{
    lineEditingSetUp(Shell);
    bool quit = false;
    std::string line;
    while (!quit && promptLine(&line))
        kviShellRunLine(Shell, line, &quit);
}

} // namespace

int main(int argc, char **argv)
{
    static const option options[] = {{"config", required_argument, nullptr, 'c'},
                                     {"remote", required_argument, nullptr, 'r'},
                                     {"help", no_argument, nullptr, 'h'},
                                     {"version", no_argument, nullptr, 'V'},
                                     {nullptr, 0, nullptr, 0}};
    KviShellT shell;
    shell.ConfigFile = "simulator.conf";
    const char *remote = nullptr;
    bool configGiven = false;
    std::vector<std::string> commands;
    for (int c; (c = getopt_long(argc, argv, "e:", options, nullptr)) != -1;) {
        switch (c) {
        case 'c':
            shell.ConfigFile = optarg;
            configGiven = true;
            break;
        case 'r':
            remote = optarg;
            break;
        case 'e':
            commands.push_back(optarg);
            break;
        case 'h':
            usage(stdout);
            return 0;
        case 'V':
            printf("kvi-hpi-shell 1.0.0\n");
            return 0;
        default:
            fputs(usageLine, stderr);
            return 2;
        }
    }
    if ((remote != nullptr && configGiven) || argc - optind > 1) {
        fprintf(stderr, "kvi-hpi-shell: %s",
                remote != nullptr && configGiven ? "--config and --remote exclude each other\n"
                                                 : usageLine);
        return 2;
    }
    std::ifstream script;
    if (optind < argc) {
        script.open(argv[optind]);
        if (!script) {
            fprintf(stderr, "kvi-hpi-shell: cannot read %s\n", argv[optind]);
            return 1;
        }
    }
    if (!kviShellStart(shell, remote))
        return 1;
    int failed = 0;
    bool quit = false;
    for (const std::string &command : commands)
        if (!quit)
            failed += !kviShellRunLine(shell, command, &quit);
    if (script.is_open())
        failed += runLines(shell, script);
    if (commands.empty() && !script.is_open())
        interactive(shell);
    kviShellStop(shell);
    return failed == 0 ? 0 : 1;
}
