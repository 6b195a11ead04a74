// A tools image as the maker ships it, for the tests that read one: a tree
// holding "manifest.txt" and a file of many blocks, mastered by xorriso with
// Rock Ridge and Joliet names, and hash data written and signed by
// `tvxguest hashdata create` with the test PKI's maker certificate.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

#include "support/log_capture.h"
#include "support/run_argv.h"

namespace tvxtest {

// SignedToolsImage makes NAME in `dir` with NAME.sha beside it (and
// NAME.sig unless the signature is embedded); `pad` zero bytes are appended
// to the image before its hash data is written. Returns the image path, or
// "" when a step fails.
inline std::string SignedToolsImage(const TempDir &dir, const std::string &certDir,
                                    const std::string &name, const std::string &manifest,
                                    uint32_t blockSize = 2048, bool embed = false,
                                    size_t pad = 0) {
  std::string tree = dir.Join("tree-" + name), iso = dir.Join(name);
  std::filesystem::create_directories(tree + "/guesttools");
  WriteFileOrDie(tree + "/manifest.txt", manifest);
  WriteFileOrDie(tree + "/guesttools/payload.bin", Bytes(150001, 3));
  if (RunArgv({"xorriso", "-as", "mkisofs", "-quiet", "-R", "-J", "-o", iso, tree}) != 0) return "";
  if (pad != 0) WriteFileOrDie(iso, ReadFileOrDie(iso) + std::string(pad, '\0'));
  // The hash-data writer takes the leaf with its chain.
  std::string signer = certDir + "signers/maker", chain = dir.Join("maker-chain.pem");
  WriteFileOrDie(chain, ReadFileOrDie(signer + ".pem") + ReadFileOrDie(signer + ".chain"));
  std::vector<std::string> argv = {ToolPath(), "hashdata", "create", "--block-size",
                                   std::to_string(blockSize), "--quiet", "--key",
                                   signer + ".key", "--cert", chain};
  if (embed) argv.push_back("--embed-signature");
  argv.push_back(iso);
  argv.push_back(iso + ".sha");
  return RunArgv(argv) == 0 ? iso : "";
}

}  // namespace tvxtest
