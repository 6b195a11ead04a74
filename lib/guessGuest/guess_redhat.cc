// Recogniser of the Red Hat family of install media: Red Hat Linux, Red Hat
// Enterprise Linux, CentOS, Fedora, Oracle Linux and Asianux.
//
// Installer media of this family name their release on the second line of
// .discinfo and the architecture on the third. Older CentOS media say only
// "final" there, so the CentOS signing key in the root decides the
// generation first. Media without .discinfo are told by their boot
// configuration (RHEL 7 boot media), a live root file system (Fedora and
// Asianux live images) or the first line of RELEASE-NOTES (the oldest
// releases).
#include <cstdlib>
#include <cstring>
#include <string>

#include "lib/guessGuest/guess_internal.h"
#include "platform/str.h"

namespace tvx::guess {
namespace {

enum class Arch { kX86_64, kI386, kAarch64 };

// Long-term CentOS 7 media ship one of these perl builds in Packages; the
// minimal image does not ship perl at all.
constexpr const char *kCentos7Perl[] = {
    "perl-5.16.3-285.el7.x86_64.rpm", "perl-5.16.3-283.el7.x86_64.rpm",
    "perl-5.16.3-286.el7.x86_64.rpm", "perl-5.16.3-291.el7.x86_64.rpm",
    "perl-5.16.3-292.el7.x86_64.rpm", "perl-5.16.3-293.el7.x86_64.rpm",
    "perl-5.16.3-294.el7_6.x86_64.rpm", "perl-5.16.3-295.el7.x86_64.rpm",
    "perl-5.16.3-297.el7.x86_64.rpm",
};

uint32_t CentosGeneration(GuessMedium *medium) {
  if (Guess_FileExists(medium, "", "RPM-GPG-KEY-CentOS-3")) return GUESS_VERSION_CENTOS_3;
  if (Guess_FileExists(medium, "", "RPM-GPG-KEY-centos4")) return GUESS_VERSION_CENTOS_4;
  if (Guess_FileExists(medium, "", "RPM-GPG-KEY-CentOS-5")) return GUESS_VERSION_CENTOS_5;
  if (Guess_FileExists(medium, "", "RPM-GPG-KEY-CentOS-6")) return GUESS_VERSION_CENTOS_6;
  if (!Guess_FileExists(medium, "", "RPM-GPG-KEY-CentOS-7")) return GUESS_VERSION_UNKNOWN;
  for (const char *perl : kCentos7Perl) {
    if (Guess_FileExists(medium, "Packages", perl)) return GUESS_VERSION_CENTOS_7;
  }
  return GUESS_VERSION_CENTOS_7_MINIMAL;
}

bool Begins(const char *text, const char *prefix) { return StrUtil_StartsWith(text, prefix) != 0; }

bool LiveImage(GuessMedium *medium) { return Guess_FileExists(medium, "LiveOS", "squashfs.img"); }

// An answer: the identifier and class, or no identifier when the medium is
// not recognised.
struct Answer {
  const char *guestOS = nullptr;
  uint32_t version = GUESS_VERSION_UNKNOWN;
};

// How a release-name row decides the version class.
enum class ClassRule { kNone, kRhel7Name, kRhel7TreeInfo, kAsianux7, kFedora };

struct NameRow {
  bool contains;              // test `match[0]` as a substring, not as prefixes
  const char *match[3];       // prefixes; any one of them selects the row
  const char *id[3];          // by Arch; null: not recognised on that architecture
  ClassRule rule;
};

// Release names, first match wins. Prefix tests are case-sensitive.
constexpr NameRow kNameRows[] = {
    {false, {"Red Hat Enterprise Linux 4"}, {"rhel4-64", "rhel4", "rhel4"}, ClassRule::kNone},
    {false,
     {"Red Hat Enterprise Linux Client 5", "Red Hat Enterprise Linux Server 5"},
     {"rhel5-64", "rhel5", "rhel5"},
     ClassRule::kNone},
    {false, {"final", "Final", "CentOS"}, {"centos-64", "centos", "centos"}, ClassRule::kNone},
    {false, {"Red Hat Enterprise Linux 6"}, {"rhel6-64", "rhel6", "rhel6"}, ClassRule::kNone},
    {false, {"RHEL-7."}, {"rhel7-64", "rhel7", "rhel7"}, ClassRule::kRhel7Name},
    {false, {"Red Hat Enterprise Linux 7."}, {"rhel7-64", "rhel7", "rhel7"},
     ClassRule::kRhel7TreeInfo},
    {false, {"Red Hat Enterprise Linux 8."}, {"rhel8-64", "rhel8-64", "rhel8-64"},
     ClassRule::kNone},
    {false, {"Asianux Server 7"}, {"asianux7-64", "asianux7-64", "asianux7-64"},
     ClassRule::kAsianux7},
    {false,
     {"Asianux 3.0", "Asianux Server 3 SP"},
     {"asianux3-64", "asianux3", "asianux3"},
     ClassRule::kNone},
    {false, {"Asianux Server"}, {"asianux4-64", "asianux4", "asianux4"}, ClassRule::kNone},
    {false,
     {"Enterprise Linux Enterprise Linux 4", "Oracle Linux Server 5."},
     {"oraclelinux-64", "oraclelinux", "oraclelinux"},
     ClassRule::kNone},
    {false, {"Oracle Linux 6."}, {"oraclelinux6-64", "oraclelinux6", "oraclelinux6"},
     ClassRule::kNone},
    {false, {"OL-7."}, {"oraclelinux7-64", nullptr, nullptr}, ClassRule::kNone},
    {false, {"Oracle Linux 8."}, {"oraclelinux8-64", nullptr, nullptr}, ClassRule::kNone},
    {true, {"Fedora"}, {"Fedora-64", "Fedora", "arm-Fedora-64"}, ClassRule::kFedora},
};

bool RowMatches(const NameRow &row, const char *name) {
  if (row.contains) return Contains(name, row.match[0]);
  for (const char *prefix : row.match) {
    if (prefix != nullptr && Begins(name, prefix)) return true;
  }
  return false;
}

// ParseLeadingInt reads a base-10 number as the C library's atoi family
// would (leading blanks, a sign, digits), saturating instead of overflowing;
// no digits read as 0.
long ParseLeadingInt(const char *text) {
  char *end = nullptr;
  long n = std::strtol(text, &end, 10);
  return end == text ? 0 : n;
}

uint32_t FedoraClass(const char *name) {
  // The number stands right after the product words these media begin with.
  size_t at = Contains(name, "Fedora Core ") ? 12 : Contains(name, "Fedora-Server ") ? 14 : 7;
  long n = at <= std::strlen(name) ? ParseLeadingInt(name + at) : 0;
  if (n < 8) return GUESS_VERSION_UNKNOWN;
  if (n == 8) return GUESS_VERSION_FEDORA_8;
  if (n <= 12) return GUESS_VERSION_FEDORA_9_TO_12;
  if (n == 13) return GUESS_VERSION_FEDORA_13;
  if (n <= 16) return GUESS_VERSION_FEDORA_14_TO_16;
  if (n == 17) return GUESS_VERSION_FEDORA_17;
  if (n == 18) return GUESS_VERSION_FEDORA_18;
  if (n <= 20) return GUESS_VERSION_FEDORA_19_TO_20;
  if (n == 21) return GUESS_VERSION_FEDORA_21;
  if (n <= 28) return GUESS_VERSION_FEDORA_22_TO_28;
  return GUESS_VERSION_FEDORA_29_OR_HIGHER;
}

// A RHEL 7 tree names its variants in .treeinfo; a medium that carries the
// workstation variant is a workstation medium even when it lists others.
bool Rhel7Variant(GuessMedium *medium, uint32_t *out_version) {
  Text treeInfo = ReadText(medium, ".TREEINFO");
  if (!treeInfo) return false;
  if (Contains(treeInfo.get(), "variants = Workstation")) {
    *out_version = GUESS_VERSION_RHEL_WORKSTATION;
  } else if (Contains(treeInfo.get(), "variants = Server")) {
    *out_version = GUESS_VERSION_RHEL_SERVER;
  } else if (Contains(treeInfo.get(), "variants = Client")) {
    *out_version = GUESS_VERSION_RHEL_CLIENT;
  } else {
    return false;
  }
  return true;
}

Answer ByNameTable(GuessMedium *medium, const char *name, Arch arch) {
  for (const NameRow &row : kNameRows) {
    if (!RowMatches(row, name)) continue;
    Answer answer;
    answer.guestOS = row.id[static_cast<int>(arch)];
    if (answer.guestOS == nullptr) return Answer();
    switch (row.rule) {
      case ClassRule::kNone:
        break;
      case ClassRule::kRhel7Name: {
        std::string lower = tvx::ascii::Lower(name);
        answer.version = Contains(lower.c_str(), "server")        ? GUESS_VERSION_RHEL_SERVER
                         : Contains(lower.c_str(), "workstation") ? GUESS_VERSION_RHEL_WORKSTATION
                                                                  : GUESS_VERSION_RHEL_CLIENT;
        break;
      }
      case ClassRule::kRhel7TreeInfo:
        if (!Rhel7Variant(medium, &answer.version)) return Answer();
        break;
      case ClassRule::kAsianux7:
        if (LiveImage(medium)) answer.version = GUESS_VERSION_ASIANUX_7_LIVE;
        break;
      case ClassRule::kFedora:
        answer.version = FedoraClass(name);
        break;
    }
    return answer;
  }
  return Answer();
}

// FromDiscInfo decides by the release name and architecture in .discinfo.
Answer FromDiscInfo(GuessMedium *medium, const char *discInfo, uint32_t centos) {
  unsigned int index = 0;
  Text first(StrUtil_GetNextToken(&index, discInfo, "\n"));
  Text name(StrUtil_GetNextToken(&index, discInfo, "\n"));
  Text archLine(StrUtil_GetNextToken(&index, discInfo, "\n"));
  if (!name || !archLine) return Answer();

  Arch arch;
  if (std::strcmp(archLine.get(), "x86_64") == 0) {
    arch = Arch::kX86_64;
  } else if (std::strcmp(archLine.get(), "i386") == 0) {
    arch = Arch::kI386;
  } else if (std::strcmp(archLine.get(), "aarch64") == 0 && Contains(name.get(), "Fedora")) {
    arch = Arch::kAarch64;
  } else {
    return Answer();
  }

  const bool centos8 = std::strcmp(name.get(), "CentOS Linux 8") == 0;
  const bool stream8 = std::strcmp(name.get(), "CentOS Stream 8") == 0;
  const bool x64 = arch == Arch::kX86_64;
  if (centos8 || stream8) {
    if (!x64) return Answer();
    return {"centos8-64", centos8 ? GUESS_VERSION_CENTOS_8 : GUESS_VERSION_CENTOS_8_STREAM};
  }
  switch (centos) {
    case GUESS_VERSION_CENTOS_3:
    case GUESS_VERSION_CENTOS_4:
    case GUESS_VERSION_CENTOS_5:
      return {x64 ? "centos-64" : "centos", centos};
    case GUESS_VERSION_CENTOS_6:
      return {x64 ? "centos6-64" : "centos6", centos};
    case GUESS_VERSION_CENTOS_7:
    case GUESS_VERSION_CENTOS_7_MINIMAL:
      // CentOS 7 was built for x86-64 only.
      return x64 ? Answer{"centos7-64", centos} : Answer();
    default:
      break;
  }
  if (Begins(name.get(), "Red Hat Enterprise Linux 3")) return {x64 ? "rhel3-64" : "rhel3"};
  return ByNameTable(medium, name.get(), arch);
}

// FromOtherMarkers decides for media without .discinfo.
Answer FromOtherMarkers(GuessMedium *medium, uint32_t centos) {
  Text bootCfg = ReadText(medium, "isolinux/isolinux.cfg");
  if (Contains(bootCfg.get(), "Red Hat Enterprise Linux 7.")) {
    if (Contains(bootCfg.get(), "x86_64")) return {"rhel7-64", centos};
    if (Contains(bootCfg.get(), "i386")) return {"rhel7", centos};
    return Answer();
  }

  if (LiveImage(medium)) {
    Text readMe = ReadText(medium, "Documents/README");
    if (Contains(readMe.get(), "Asianux Server 7")) {
      return {"asianux7-64", GUESS_VERSION_ASIANUX_7_LIVE};
    }
    const char *id = Guess_FileExists(medium, "EFI/BOOT", "grubx64.efi")    ? "Fedora-64"
                     : Guess_FileExists(medium, "EFI/BOOT", "BOOTAA64.EFI") ? "arm-Fedora-64"
                                                                            : "Fedora";
    return {id, GUESS_VERSION_FEDORA_LIVE};
  }

  Text notes = ReadText(medium, "RELEASE-NOTES");
  if (!notes) return Answer();
  unsigned int index = 0;
  Text line(StrUtil_GetNextToken(&index, notes.get(), "\n"));
  if (!line) return Answer();
  if (Begins(line.get(), "Red Hat Enterprise Linux")) {
    return Contains(line.get(), " 2.1 ") ? Answer{"rhel2", centos} : Answer();
  }
  if (Begins(line.get(), "Red Hat Linux")) return {"redhat", centos};
  return Answer();
}

Bool Recognise(GuessMedium *medium, GuessResult *result) {
  Text discInfo = ReadText(medium, ".DISCINFO");
  const bool bootConfig = Guess_FileExists(medium, "isolinux", "isolinux.cfg");
  const uint32_t centos = CentosGeneration(medium);

  Answer answer = discInfo ? FromDiscInfo(medium, discInfo.get(), centos)
                           : FromOtherMarkers(medium, centos);
  if (answer.guestOS == nullptr) return NotRecognised(result);
  result->guestOS = answer.guestOS;
  result->version = answer.version;
  result->noIsolinuxConfig = bootConfig ? FALSE : TRUE;
  return TRUE;
}

}  // namespace
}  // namespace tvx::guess

extern "C" TVX_EXPORT Bool Guess_RedHat(GuessMedium *medium, GuessResult *result) {
  try {
    return tvx::guess::Recognise(medium, result);
  } catch (...) {
    // Only allocation can throw; the result has not been touched yet.
    return tvx::guess::NotRecognised(result);
  }
}
