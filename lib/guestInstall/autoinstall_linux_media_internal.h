// Internals of the Linux install media: the boot-configuration parser and the
// pieces the boot tree and the floppy share. Not exported.
#pragma once

#include <string>
#include <string_view>

#include "tvx_autoinstall.h"

namespace tvx::autoinstall {

// The first complete boot entry of an isolinux configuration.
struct BootEntry {
  std::string kernel;
  std::string initrd;
  std::string append;  // every argument but "initrd=", each followed by one space
};

// Configuration files are read up to this many bytes.
inline constexpr size_t kMaxConfigBytes = 4096;

// parseIsolinuxConfig fills `out` from the first entry of `text` that has a
// kernel, an append line and an initrd; false when there is none.
bool parseIsolinuxConfig(std::string_view text, BootEntry *out);

// removeAskMethod drops every "askmethod" argument of `append`.
void removeAskMethod(std::string *append);

// NeedsLdlinux: the boot loader image (its first bytes) is of a generation
// that loads ldlinux.c32 before anything else.
bool NeedsLdlinux(std::string_view isolinuxBin);

// BootConfigText is the one-entry configuration of the boot tree; false when
// it would exceed kMaxConfigBytes.
bool BootConfigText(const std::string &kernelBase, const std::string &initrdBase,
                    const std::string &append, const char *bootArguments, std::string *out);

struct LinuxAnswerFileRow;
// LinuxRow: the row of the Linux answer-file table for `kind`, as it is at
// the moment of the call; the empty row 0 for values outside the table.
const LinuxAnswerFileRow *LinuxRow(AutoInstallLinuxKind kind);

// CopyReplacing copies the host file `from` to `to` through a temporary file
// and a rename; false (errno set) on failure.
bool CopyReplacing(const char *from, const char *to);

}  // namespace tvx::autoinstall
