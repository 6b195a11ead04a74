// tvxguest: the command-line face of libtvxguest.
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "command.h"
#include "tvx_base.h"
#include "tvx_log.h"

namespace tvxcli {
namespace {

std::vector<Command> &Registry() {
  static std::vector<Command> commands;
  return commands;
}

bool g_verbose = false;

}  // namespace

void VerboseLogSink(TvxLogLevel level, const char *text, void *) {
  std::fputs("tvxguest: lib: ", stderr);
  std::fputs(text, stderr);
  size_t n = std::strlen(text);
  if (n == 0 || text[n - 1] != '\n') std::fputc('\n', stderr);
  (void)level;
}

namespace {

void PrintHelp(FILE *out) {
  std::fprintf(out,
               "Usage: tvxguest [-v] COMMAND [ARGS...]\n"
               "       tvxguest --version | --help\n\n"
               "Install-media recognition, unattended install and guest-tools services.\n\n"
               "Options:\n"
               "  -v, --verbose   print the library's diagnostic lines to standard error\n"
               "  --version       print the version and exit\n"
               "  -h, --help      show this help\n\n"
               "Commands:\n");
  for (const Command &c : Registry()) {
    std::fprintf(out, "  %-12s %s\n", c.name, c.summary);
  }
  std::fprintf(out, "\nRun 'tvxguest COMMAND --help' for a command's options.\n");
}

}  // namespace

const std::vector<Command> &Commands() { return Registry(); }

CommandRegistration::CommandRegistration(const Command &cmd) {
  auto &r = Registry();
  auto it = r.begin();
  while (it != r.end() && std::strcmp(it->name, cmd.name) < 0) ++it;
  r.insert(it, cmd);
}

int UsageError(const char *cmd, const std::string &message) {
  std::fprintf(stderr, "tvxguest %s: %s\nTry 'tvxguest %s --help'.\n", cmd, message.c_str(), cmd);
  return 64;
}

bool IsHelp(const std::string &arg) { return arg == "-h" || arg == "--help"; }

bool Verbose() { return g_verbose; }

}  // namespace tvxcli

int main(int argc, char **argv) {
  using namespace tvxcli;
  int i = 1;
  for (; i < argc && argv[i][0] == '-'; ++i) {
    std::string a = argv[i];
    if (a == "-v" || a == "--verbose") {
      g_verbose = true;
    } else if (IsHelp(a)) {
      PrintHelp(stdout);
      return 0;
    } else if (a == "--version") {
      std::printf("tvxguest %s\n", Tvx_GetVersion());
      return 0;
    } else {
      std::fprintf(stderr, "tvxguest: unknown option '%s'\n", argv[i]);
      PrintHelp(stderr);
      return 64;
    }
  }
  if (i >= argc) {
    PrintHelp(stderr);
    return 64;
  }
  if (g_verbose) Tvx_SetLogSink(VerboseLogSink, nullptr);
  for (const Command &c : Commands()) {
    if (std::strcmp(c.name, argv[i]) == 0) {
      std::vector<std::string> args(argv + i + 1, argv + argc);
      return c.run(args);
    }
  }
  std::fprintf(stderr, "tvxguest: unknown command '%s'\n", argv[i]);
  PrintHelp(stderr);
  return 64;
}
