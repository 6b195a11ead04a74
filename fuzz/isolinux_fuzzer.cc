// Boot configurations come from install media anyone can make: the parser
// must hold its invariants on any text.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

#include "lib/guestInstall/autoinstall_linux_media_internal.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  if (size > 8192) return 0;
  std::string_view text(reinterpret_cast<const char *>(data), size);
  tvx::autoinstall::BootEntry e;
  if (tvx::autoinstall::parseIsolinuxConfig(text, &e)) {
    // A complete entry, and an append text of whole arguments that a
    // one-entry configuration can hold.
    if (e.kernel.empty() || e.initrd.empty() || e.append.size() > 511) abort();
    if (e.append.find("  ") != std::string::npos || e.append.find('\n') != std::string::npos) {
      abort();
    }
    std::string once = e.append;
    tvx::autoinstall::removeAskMethod(&once);
    std::string twice = once;
    tvx::autoinstall::removeAskMethod(&twice);
    if (once != twice) abort();
    std::string cfg;
    tvx::autoinstall::BootConfigText(e.kernel, e.initrd, once, "ks=cdrom:/ks.cfg", &cfg);
  }
  tvx::autoinstall::NeedsLdlinux(text);
  return 0;
}
