// The sub-commands of twlogctl, one function each: it adds the sub-command with its options to the
// parser. What the sub-command does happens while the arguments are parsed, and leaves the
// program's exit code in `exit_code`.
#ifndef TARNWICK_TOOLS_TWLOGCTL_COMMANDS_H_
#define TARNWICK_TOOLS_TWLOGCTL_COMMANDS_H_

namespace CLI {
class App;
}

// The exit codes of every sub-command.
constexpr int kExitDone = 0;
constexpr int kExitWrong = 1;  // a finding, nothing found, or refused
constexpr int kExitUsage = 2;

// The shared record of levels.
void AddStatus(CLI::App* app, int* exit_code);
void AddCreate(CLI::App* app, int* exit_code);
void AddRemove(CLI::App* app, int* exit_code);
void AddSet(CLI::App* app, int* exit_code);
void AddTimeScale(CLI::App* app, int* exit_code);

// The record and the settings file.
void AddSave(CLI::App* app, int* exit_code);
void AddLoad(CLI::App* app, int* exit_code);
void AddDiff(CLI::App* app, int* exit_code);

// The logs.
void AddFollow(CLI::App* app, int* exit_code);
void AddShow(CLI::App* app, int* exit_code);
void AddStats(CLI::App* app, int* exit_code);
void AddTop(CLI::App* app, int* exit_code);
void AddWrite(CLI::App* app, int* exit_code);
void AddDoctor(CLI::App* app, int* exit_code);

#endif  // TARNWICK_TOOLS_TWLOGCTL_COMMANDS_H_
