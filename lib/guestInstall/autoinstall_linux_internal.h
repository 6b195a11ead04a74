// Linux answer files: the process-wide answer-file table that the medium
// builders read, and the password crypt the templates are filled with. Not
// exported.
#pragma once

#include <cstddef>
#include <initializer_list>
#include <string>
#include <string_view>

#include "tvx_autoinstall.h"
#include "tvx_autoinstall_linux.h"

namespace tvx::autoinstall {

// One row per AutoInstallLinuxKind, indexed by the kind.
struct LinuxAnswerFileRow {
  const char *templateText;    // the kind's default template; NULL for kind 0
  const char *bootArguments;   // kernel arguments that find the answer file
  const char *answerFileName;  // "ks.cfg", "preseed.cfg", "autoinst.xml", "auto_i~1.cfg"
  Bool needsFloppy;            // the installer reads the file from a floppy
};

inline constexpr size_t kLinuxAnswerFileRows = AUTOINSTALL_LINUX_MANDRIVA + 1;

// Writable on purpose: preparing a Red Hat answer file stores the kickstart
// argument chosen for that guest into row AUTOINSTALL_LINUX_REDHAT's
// bootArguments (always a constant text of the library), and the boot tree
// and floppy builders read whatever the row holds then. So a Red Hat answer
// file is prepared before its medium is built. Single-threaded.
extern LinuxAnswerFileRow linuxAnswerFileTable[kLinuxAnswerFileRows];

// The Ubuntu answer file lives in this subdirectory of the output
// directory (the installer's custom-installation directory).
inline constexpr char kUbuntuAnswerSubdir[] = "custom";

// LinuxAnswerFilePath: where AutoInstall_PrepareAnswerFileEx_Linux puts the
// answer file of `kind` below `outputDir` ("" for kind 0):
// outputDir/ks.cfg, outputDir/custom/preseed.cfg, ...
std::string LinuxAnswerFilePath(AutoInstallLinuxKind kind, const char *outputDir);

// The salt of a SHA256_crypt call with its rounds parameter taken apart.
struct CryptSalt {
  std::string_view salt;  // at most 16 characters, up to the first '$'
  size_t rounds = 5000;
  bool customRounds = false;  // "rounds=N$" was given (N then clamped)
};
CryptSalt ParseCryptSalt(const char *salt);

// AutoInstallCryptLinuxPassword draws a 16-character salt and returns the
// "$5$SALT$DIGEST" form of `password` in a static buffer that the next call
// overwrites (copy it at once), or NULL for a NULL password or a password
// SHA256_crypt refuses (longer than 256 bytes). Reseeds the process-wide
// rand() generator from the clock: two calls in one second draw the same
// salt. Not reentrant.
const char *AutoInstallCryptLinuxPassword(const char *password);

// What a Red Hat family guest identifier and version class say about its
// installer.
struct KickstartGuest {
  bool isRhel = false;
  bool isAsianux = false;
  bool enterprise = false;  // RHEL, or a CentOS release class
  int major = 0;            // release of enterprise and Asianux guests
  bool old = false;         // enterprise release 4 or earlier
  bool rhel5 = false;       // enterprise release 5: asks for an installation number
};
KickstartGuest ClassifyKickstartGuest(const char *guestOS, uint32_t version);

// The filled-in texts of a kickstart file, already escaped or crypted.
struct KickstartAnswers {
  const char *userName;
  const char *fullNameShell;  // escaped for a double-quoted shell word
  const char *userCrypt;
  const char *rootCrypt;
  const char *installationKey;  // optional
  bool powerOff;
};

// MakeKickstart fills the kickstart template chosen for the guest into
// `out` and names the kernel argument that finds it (a constant text).
bool MakeKickstart(const char *guestOS, uint32_t version, const KickstartAnswers &answers,
                   std::string *out, const char **out_argument);

// IsVersionIn: `version` (a GuessVersion value) is one of `any`.
inline bool IsVersionIn(uint32_t version, std::initializer_list<GuessVersion> any) {
  for (GuessVersion v : any) {
    if (version == static_cast<uint32_t>(v)) return true;
  }
  return false;
}

// Escapes for the places a typed text lands in. Each returns a new text.
std::string EscapeShellDoubleQuoted(const std::string &text);  // \ " $ `
std::string EscapePerlDoubleQuoted(const std::string &text);   // \ " $ @
std::string EscapeCdata(const std::string &text);              // "]]>" split

}  // namespace tvx::autoinstall
