#include "command_group.h"

#include <cstdio>
#include <cstring>
#include <map>

namespace tvxcli {
namespace {

std::map<std::string, std::vector<Command>> &Groups() {
  static std::map<std::string, std::vector<Command>> groups;
  return groups;
}

void PrintGroupHelp(FILE *out, const char *group, const char *summary) {
  std::fprintf(out, "Usage: tvxguest %s SUBCOMMAND [ARGS...]\n\n%s\n\nSubcommands:\n", group,
               summary);
  for (const Command &c : Subcommands(group)) std::fprintf(out, "  %-12s %s\n", c.name, c.summary);
  std::fprintf(out, "\nRun 'tvxguest %s SUBCOMMAND --help' for a subcommand's options.\n", group);
}

}  // namespace

SubcommandRegistration::SubcommandRegistration(const char *group, const Command &sub) {
  auto &list = Groups()[group];
  auto it = list.begin();
  while (it != list.end() && std::strcmp(it->name, sub.name) < 0) ++it;
  list.insert(it, sub);
}

const std::vector<Command> &Subcommands(const char *group) { return Groups()[group]; }

int RunGroup(const char *group, const char *summary, const std::vector<std::string> &args) {
  if (args.empty()) {
    PrintGroupHelp(stderr, group, summary);
    return 64;
  }
  if (IsHelp(args[0])) {
    PrintGroupHelp(stdout, group, summary);
    return 0;
  }
  for (const Command &c : Subcommands(group)) {
    if (args[0] == c.name) return c.run(std::vector<std::string>(args.begin() + 1, args.end()));
  }
  return UsageError(group, "unknown subcommand '" + args[0] + "'");
}

}  // namespace tvxcli
