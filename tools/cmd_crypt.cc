// tvxguest crypt: the SHA-256 crypt form of a password, as the Linux answer
// files carry it, and a check of a password against such a form.
#include <sys/random.h>

#include <cstdio>
#include <cstring>
#include <iostream>
#include <string>
#include <vector>

#include "arg_parser.h"
#include "command.h"
#include "json.h"
#include "tvx_autoinstall_linux.h"

namespace tvxcli {
namespace {

constexpr char kName[] = "crypt";

void PrintHelp() {
  std::printf(
      "Usage: tvxguest crypt [--salt SALT | --check HASH] [--json] [PASSWORD | --stdin]\n\n"
      "Print the SHA-256 crypt form (\"$5$SALT$DIGEST\") of PASSWORD.\n\n"
      "Options:\n"
      "  --salt SALT    salt to use, optionally with \"$5$\" and \"rounds=N$\" in front\n"
      "                 (default: 16 random characters, 5000 rounds)\n"
      "  --check HASH   compare PASSWORD with HASH (a \"$5$\" text, e.g. from an answer\n"
      "                 file) instead: exit status 0 when it matches, 1 when not\n"
      "  --stdin        read the password from the first line of standard input\n"
      "  --json         print one JSON object instead of text\n"
      "  -h, --help     show this help\n\n"
      "Exit status: 0 done (or matched), 1 refused (or no match), 64 usage error.\n");
}

// RandomSalt draws 16 characters of the crypt alphabet from the kernel.
bool RandomSalt(std::string *out) {
  static constexpr char kAlphabet[] =
      "./0123456789ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz";
  unsigned char bytes[16];
  if (getrandom(bytes, sizeof bytes, 0) != static_cast<ssize_t>(sizeof bytes)) return false;
  out->assign("$5$");
  for (unsigned char b : bytes) out->push_back(kAlphabet[b & 63]);
  return true;
}

int Run(const std::vector<std::string> &args) {
  std::string salt, check, password;
  bool haveSalt = false, haveCheck = false, fromStdin = false, json = false;
  std::vector<std::string> positional;
  int parsed = ArgParser(kName, PrintHelp)
                   .Flag("--json", &json)
                   .Flag("--stdin", &fromStdin)
                   .Value("--salt", &salt, &haveSalt)
                   .Value("--check", &check, &haveCheck)
                   .Parse(args, &positional);
  if (parsed >= 0) return parsed;
  if (haveSalt && haveCheck) return UsageError(kName, "give --salt or --check, not both");
  if (positional.size() != (fromStdin ? 0u : 1u)) {
    return UsageError(kName, "expected exactly one PASSWORD, or --stdin");
  }
  if (fromStdin) {
    std::getline(std::cin, password);
    if (!password.empty() && password.back() == '\r') password.pop_back();
  } else {
    password = positional[0];
  }
  if (haveCheck) {
    salt = check;
  } else if (!haveSalt && !RandomSalt(&salt)) {
    std::fprintf(stderr, "tvxguest crypt: no random salt: %s\n", std::strerror(errno));
    return 1;
  }

  char hash[128];
  bool ok = SHA256_crypt(password.c_str(), salt.c_str(), hash, sizeof hash) != nullptr;
  bool matches = ok && haveCheck && check == hash;
  if (json) {
    JsonObject j;
    j.Bool("result", ok).StrOrNull("hash", ok ? hash : nullptr);
    if (haveCheck) j.Bool("matches", matches);
    std::printf("%s\n", j.Text().c_str());
  } else if (!ok) {
    std::fprintf(stderr, "tvxguest crypt: the password was refused (longer than 256 bytes)\n");
  } else if (haveCheck) {
    std::printf("%s\n", matches ? "match" : "no match");
  } else {
    std::printf("%s\n", hash);
  }
  explicit_bzero(password.data(), password.size());
  if (!ok) return 1;
  return haveCheck && !matches ? 1 : 0;
}

const CommandRegistration kRegistration({kName,
                                         "print or check the SHA-256 crypt form of a password",
                                         Run});

}  // namespace
}  // namespace tvxcli
