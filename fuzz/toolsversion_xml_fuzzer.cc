// The extended config file on arbitrary bytes: an extended config document,
// an update agent report and a manifest text (split at the first two NUL
// bytes). The saved status and manifest are read from the document; then the
// reports are saved into it. A save that succeeds must leave a file that
// parses again, since an unreadable file would lose every later report.
#include <unistd.h>

#include <cstdint>
#include <cstdlib>
#include <string>

#include "fuzz/split_input.h"
#include "lib/toolsversion/toolsversion_xml.h"
#include "platform/file.h"
#include "tvx_log.h"

namespace {

using namespace tvx::toolsversion;

void Quiet(TvxLogLevel, const char *, void *) {}

struct Files {
  std::string dir, config, xml;
  Files() {
    char tmpl[] = "/tmp/tvx-xml-fuzz-XXXXXX";
    dir = mkdtemp(tmpl);
    config = dir + "/vm.tvx";
    xml = dir + "/vm.xml";
    FILE *f = std::fopen(config.c_str(), "w");
    std::fputs("extendedConfigFile = \"vm.xml\"\n", f);
    std::fclose(f);
    Tvx_SetLogSink(Quiet, nullptr);
  }
  ~Files() { File_DeleteDirectoryTree(dir.c_str()); }
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  static Files files;
  if (size > 32768) return 0;
  auto parts = SplitAtNul<3>(data, size);
  tvx::UniquePtr<xmlDoc> doc = ParseXml(parts[0].data(), parts[0].size());
  if (doc == nullptr) return 0;
  if (const xmlNode *root = xmlDocGetRootElement(doc.get())) SavedGuestInfoFromRoot(root);

  FILE *f = std::fopen(files.xml.c_str(), "w");
  std::fwrite(parts[0].data(), 1, parts[0].size(), f);
  std::fclose(f);
  if (SaveXmlInfo(files.config.c_str(), parts[1].c_str(), parts[2].c_str(), -1, 1)) {
    std::string text;
    if (!ReadExtendedConfig(files.xml, &text) || ParseXml(text.data(), text.size()) == nullptr) {
      std::abort();
    }
  }
  return 0;
}
