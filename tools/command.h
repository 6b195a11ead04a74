// Subcommands of the tvxguest tool register themselves here: one file per
// subcommand (tools/cmd_*.cc) holds a static `CommandRegistration`.
#pragma once

#include <string>
#include <vector>

#include "tvx_log.h"

namespace tvxcli {

struct Command {
  const char *name;     // "detect", or "media" for a group
  const char *summary;  // one line for the top-level help
  // run gets the arguments after the subcommand name; returns the exit status.
  int (*run)(const std::vector<std::string> &args);
};

const std::vector<Command> &Commands();

struct CommandRegistration {
  explicit CommandRegistration(const Command &cmd);
};

// Usage errors print the message and "Try 'tvxguest CMD --help'." on standard
// error and return exit status 64.
int UsageError(const char *cmd, const std::string &message);

bool IsHelp(const std::string &arg);

// True when verbose logging (-v) is on.
bool Verbose();

// VerboseLogSink prints a library log line to standard error (the sink -v
// installs).
void VerboseLogSink(TvxLogLevel level, const char *text, void *ctx);

}  // namespace tvxcli
