#include "arg_parser.h"

#include "command.h"

namespace tvxcli {

ArgParser &ArgParser::Flag(const char *name, bool *on) {
  options_.push_back({name, on, nullptr});
  return *this;
}

ArgParser &ArgParser::Value(const char *name, std::string *value, bool *given) {
  return Value(name, [value, given](const std::string &v) {
    *value = v;
    if (given != nullptr) *given = true;
    return std::string();
  });
}

ArgParser &ArgParser::Value(const char *name, Take take) {
  options_.push_back({name, nullptr, std::move(take)});
  return *this;
}

ArgParser &ArgParser::Positional(Take take) {
  positional_ = std::move(take);
  return *this;
}

ArgParser::Take ArgParser::Single(std::string *out, const char *name) {
  return [out, name, seen = false](const std::string &v) mutable {
    if (seen) return std::string("more than one ") + name;
    seen = true;
    *out = v;
    return std::string();
  };
}

const ArgParser::Option *ArgParser::Find(const std::string &name) const {
  for (const Option &o : options_) {
    if (o.name == name) return &o;
  }
  return nullptr;
}

int ArgParser::Usage(const std::string &message) const { return UsageError(cmd_, message); }

int ArgParser::Parse(const std::vector<std::string> &args, std::vector<std::string> *positional) {
  auto addPositional = [&](const std::string &a) {
    if (positional_) return positional_(a);
    if (positional != nullptr) positional->push_back(a);
    return std::string();
  };
  bool options = true;
  for (size_t i = 0; i < args.size(); ++i) {
    const std::string &a = args[i];
    std::string error;
    if (!options || a.size() < 2 || a[0] != '-') {
      error = addPositional(a);
    } else if (a == "--") {
      options = false;
    } else if (IsHelp(a)) {
      help_();
      return 0;
    } else {
      // Only long options take the "--name=VALUE" spelling.
      size_t eq = a.rfind("--", 0) == 0 ? a.find('=') : std::string::npos;
      const Option *o = Find(a.substr(0, eq));
      if (o == nullptr) return Usage("unknown option '" + a + "'");
      if (o->flag != nullptr) {
        if (eq != std::string::npos) return Usage(o->name + " takes no value");
        *o->flag = true;
      } else if (eq != std::string::npos) {
        error = o->take(a.substr(eq + 1));
      } else if (i + 1 < args.size()) {
        error = o->take(args[++i]);
      } else {
        return Usage(a + " needs a value");
      }
    }
    if (!error.empty()) return Usage(error);
  }
  return -1;
}

}  // namespace tvxcli
