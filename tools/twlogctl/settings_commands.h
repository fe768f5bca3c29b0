// The record and the settings file. Each function returns the exit code.
#ifndef TARNWICK_TOOLS_TWLOGCTL_SETTINGS_COMMANDS_H_
#define TARNWICK_TOOLS_TWLOGCTL_SETTINGS_COMMANDS_H_

// Writes the record's levels and flag into the settings file.
int SaveRecord(bool json);

// Sets the record's levels and flag from the settings file, all or none.
int LoadRecord(bool json);

// Prints where the two differ. The exit code is kExitWrong when they do.
int DiffRecord(bool json);

#endif  // TARNWICK_TOOLS_TWLOGCTL_SETTINGS_COMMANDS_H_
