// ArgParser reads a subcommand's arguments the one way every subcommand
// shares, so that the same spelling works everywhere:
//   -h, --help        print the help and end with status 0
//   --flag            a switch
//   --name VALUE      an option with a value, also written --name=VALUE
//   --                the end of the options: what follows is positional
//   -anything else    refused as an unknown option (a lone "-" is positional)
// Usage errors go through UsageError (status 64).
#pragma once

#include <functional>
#include <string>
#include <vector>

namespace tvxcli {

class ArgParser {
 public:
  // Take receives an option's value; a non-empty return is a usage error.
  using Take = std::function<std::string(const std::string &value)>;

  ArgParser(const char *cmd, std::function<void()> help) : cmd_(cmd), help_(std::move(help)) {}

  ArgParser &Flag(const char *name, bool *on);
  ArgParser &Value(const char *name, std::string *value, bool *given = nullptr);
  ArgParser &Value(const char *name, Take take);
  // Positional arguments go to `take` instead of Parse's list (to keep their
  // order among options that also collect them).
  ArgParser &Positional(Take take);

  // Single takes one positional argument into *out; a second one is the
  // usage error "more than one NAME".
  static Take Single(std::string *out, const char *name);

  // Parse returns -1 when the command goes on, with the positional arguments
  // in `positional`; else the exit status to end with.
  int Parse(const std::vector<std::string> &args, std::vector<std::string> *positional = nullptr);

 private:
  struct Option {
    std::string name;
    bool *flag = nullptr;
    Take take;
  };
  const Option *Find(const std::string &name) const;
  int Usage(const std::string &message) const;

  const char *cmd_;
  std::function<void()> help_;
  std::vector<Option> options_;
  Take positional_;
};

}  // namespace tvxcli
