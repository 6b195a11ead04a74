// tvxguest signature verify: the status of a PKCS#7 signature against the
// installed maker and partner certificates.
#include <openssl/pkcs7.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "arg_parser.h"
#include "command_group.h"
#include "hashdata_writer.h"
#include "json.h"
#include "tvx_signature.h"

namespace tvxcli {
namespace {

constexpr const char *kVerify = "signature verify";
constexpr uint64_t kMaxData = 256u << 20;

void PrintVerifyHelp(FILE *out) {
  std::fprintf(out,
               "Usage: tvxguest signature verify [--data FILE] [--cert FILE] [--json] SIGNATURE\n\n"
               "Checks the PEM PKCS#7 signature in SIGNATURE and prints its status: \"Tarvex\n"
               "Signed\" (the maker's certificates), \"Partner Signed\", \"Invalid Certificate\"\n"
               "(a signer that neither trusts, or content that does not match) or \"Error\".\n\n"
               "Options:\n"
               "  --data FILE  the signed content, for a detached signature (default: the\n"
               "               content inside SIGNATURE)\n"
               "  --cert FILE  trust this certificate file as the maker's instead of the\n"
               "               installed one\n"
               "  --json       print one JSON object\n"
               "  -h, --help   show this help\n\n"
               "Exit status: 0 maker or partner signed, 1 not trusted, 2 error, 64 usage error.\n");
}

int Verify(const std::vector<std::string> &args) {
  bool json = false;
  std::string dataPath, cert, sigPath;
  int parsed = ArgParser(kVerify, [] { PrintVerifyHelp(stdout); })
                   .Flag("--json", &json)
                   .Value("--data", &dataPath)
                   .Value("--cert", &cert)
                   .Positional(ArgParser::Single(&sigPath, "SIGNATURE"))
                   .Parse(args);
  if (parsed >= 0) return parsed;
  if (sigPath.empty()) return UsageError(kVerify, "SIGNATURE is missing");

  std::string data, readError;
  char *err = nullptr;
  uint32_t status = ZELSIGN_ERROR;
  if (!dataPath.empty() && !ReadWhole(dataPath, kMaxData, &data, &readError)) {
    err = strdup(readError.c_str());
  } else if (PKCS7 *p7 = ZelSign_GetPKCS7FromFile(sigPath.c_str(), &err)) {
    status = ZelSign_VerifyStatus(p7, dataPath.empty() ? nullptr : data.data(), data.size(),
                                  cert.empty() ? nullptr : cert.c_str(), nullptr, &err);
    PKCS7_free(p7);
  }
  std::string error = err != nullptr ? err : "";
  std::free(err);
  while (!error.empty() && error.back() == '\n') error.pop_back();

  if (json) {
    std::printf("%s\n", JsonObject()
                            .Num("status", status)
                            .Str("statusText", ZelSign_StatusToString(status))
                            .StrOrNull("error", error.empty() ? nullptr : error.c_str())
                            .Text()
                            .c_str());
  } else {
    std::printf("%s\n", ZelSign_StatusToString(status));
    if (!error.empty()) std::fprintf(stderr, "tvxguest %s: %s\n", kVerify, error.c_str());
  }
  if (status == ZELSIGN_TRX_SIGNED || status == ZELSIGN_PARTNER_SIGNED) return 0;
  return status == ZELSIGN_ERROR ? 2 : 1;
}

int RunSignature(const std::vector<std::string> &args) {
  return RunGroup("signature", "Check PKCS#7 signatures.", args);
}

CommandRegistration reg({"signature", "check PKCS#7 signatures", RunSignature});
SubcommandRegistration verify("signature", {"verify", "print the status of a signature", Verify});

}  // namespace
}  // namespace tvxcli
