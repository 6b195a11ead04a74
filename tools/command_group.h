// Command groups: a top-level command ("unattended") whose sub-subcommands
// live in separate files. A file adds one with a static
//   tvxcli::SubcommandRegistration reg("unattended", {"support", "...", Run});
// and the group's own file registers the top-level command with RunGroup.
#pragma once

#include <string>
#include <vector>

#include "command.h"

namespace tvxcli {

struct SubcommandRegistration {
  SubcommandRegistration(const char *group, const Command &sub);
};

// Subcommands returns the group's subcommands sorted by name.
const std::vector<Command> &Subcommands(const char *group);

// RunGroup dispatches `args` (after the group name) to a subcommand, or
// prints the group's help (`summary` is its first line) for --help and
// usage errors.
int RunGroup(const char *group, const char *summary, const std::vector<std::string> &args);

}  // namespace tvxcli
