// Making and removing the record.
#ifndef TARNWICK_TOOLS_TWLOGCTL_CREATE_REMOVE_H_
#define TARNWICK_TOOLS_TWLOGCTL_CREATE_REMOVE_H_

#include <sys/types.h>

#include <optional>
#include <string>

struct CreateOptions {
  std::optional<mode_t> mode;        // kDefaultMode when it is not given
  std::optional<std::string> group;  // a name or a number; the caller's group when it is not given
  bool json = false;
};

// The owner's processes and those of a group change levels; nobody else sees them.
constexpr mode_t kDefaultMode = 0660;

// A mode from octal digits that lets the owner read and write. Results: nothing for any other text.
std::optional<mode_t> ParseRecordMode(const std::string& text);

// Results: the exit code.
int CreateRecord(const CreateOptions& options);
int RemoveRecord(bool yes, bool json);

#endif  // TARNWICK_TOOLS_TWLOGCTL_CREATE_REMOVE_H_
