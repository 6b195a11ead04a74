// Windows guests: display names of the images on a medium, whether
// unattended install is offered, and the account-name rule.
//
// An image's raw name is its base name, a space and an edition key in
// capitals as the medium's image catalogue spells it, for instance
// "Windows 10 ENTERPRISEN". The key may carry a modifier ("N", "CORE", ...)
// glued to its end, so keys are matched as prefixes and the rest is looked
// up among the modifiers.
#include <cstdlib>
#include <cstring>
#include <string>

#include "lib/guestInstall/autoinstall_internal.h"
#include "platform/msg.h"
#include "platform/str.h"
#include "platform/util.h"

namespace tvx::autoinstall {
namespace {

struct NameMessage {
  const char *name;
  const char *message;
};

constexpr NameMessage windowsPrefixNames[] = {
    {"Windows Longhorn", "@&!*@*@(msg.autoinstall.winpfx_2k8)Windows Server 2008"},
    {"Windows Server 2008 R2", "@&!*@*@(msg.autoinstall.winpfx_2k8r2)Windows Server 2008 R2"},
    {"Windows Server 2016 Technical Preview 5",
     "@&!*@*@(msg.autoinstall.winpfx_2016tp)Windows Server 2016 TP5"},
};

// Order matters: a longer key that shares its beginning with a shorter one
// ("SERVERSTANDARDA", "SERVERSTANDARD") comes first, and a later key that
// also matches overrides the edition text.
constexpr NameMessage windowsEditionNames[] = {
    {"STARTER", "@&!*@*@(msg.autoinstall.win_starter) Starter"},
    {"HOMEBASIC", "@&!*@*@(msg.autoinstall.win_homebasic) Home Basic"},
    {"HOMEPREMIUM", "@&!*@*@(msg.autoinstall.win_homepremium) Home Premium"},
    {"PROFESSIONAL", "@&!*@*@(msg.autoinstall.win_pro) Professional"},
    {"BUSINESS", "@&!*@*@(msg.autoinstall.win_business) Business"},
    {"ENTERPRISE", "@&!*@*@(msg.autoinstall.win_enterprise) Enterprise"},
    {"ULTIMATE", "@&!*@*@(msg.autoinstall.win_ultimate) Ultimate"},
    {"Pro", "@&!*@*@(msg.autoinstall.win8_pro) Pro"},
    {"Enterprise", "@&!*@*@(msg.autoinstall.win8_enterprise) Enterprise"},
    {"Home", "@&!*@*@(msg.autoinstall.win_home) Home"},
    {"Education", "@&!*@*@(msg.autoinstall.win_education) Education"},
    {"SERVERSTANDARDA", "@&!*@*@(msg.autoinstall.winsrv_standard) Standard"},
    {"SERVERSTANDARD", "@&!*@*@(msg.autoinstall.winsrv_standard) Standard"},
    {"SERVERWEB", "@&!*@*@(msg.autoinstall.winsrv_web) Web Edition"},
    {"SERVERDATACENTERA", "@&!*@*@(msg.autoinstall.winsrv_datacenter) Datacenter"},
    {"SERVERDATACENTER", "@&!*@*@(msg.autoinstall.winsrv_datacenter) Datacenter"},
    {"SERVERENTERPRISE", "@&!*@*@(msg.autoinstall.winsrv_enterprise) Enterprise"},
    {"SERVERSBSSTANDARD", "@&!*@*@(msg.autoinstall.winsrv_sbs_std) Small Business Standard"},
    {"SERVERSBSPRIME", "@&!*@*@(msg.autoinstall.winsrv_sbs_found) Small Business Foundation"},
    {"SERVERSBSPREMIUM", "@&!*@*@(msg.autoinstall.winsrv_sbs_premium) Small Business Premium"},
    {"SERVERSOLUTION", "@&!*@*@(msg.autoinstall.winsrv_solution) Essentials"},
    {"SERVERSTORAGESTANDARD", "@&!*@*@(msg.autoinstall.winsrv_sto_std) Storage Standard"},
    {"SERVERSTORAGEWORKGROUP", "@&!*@*@(msg.autoinstall.winsrv_sto_wg) Storage Workgroup"},
};

constexpr NameMessage windowsEditionModifiers[] = {
    {"N", "@&!*@*@(msg.autoinstall.winsfx_n) N"},
    {"_N", "@&!*@*@(msg.autoinstall.winsfx_n) N"},
    {"_2015_LTSB", "@&!*@*@(msg.autoinstall.winsfx_2015ltsb) 2015 LTSB"},
    {"_N_2015_LTSB", "@&!*@*@(msg.autoinstall.winsfx_n2015ltsb) N 2015 LTSB"},
    {"_2016_LTSB", "@&!*@*@(msg.autoinstall.winsfx_2016ltsb) 2016 LTSB"},
    {"_N_2016_LTSB", "@&!*@*@(msg.autoinstall.winsfx_n2016ltsb) N 2016 LTSB"},
    {"_LTSC_2019", "@&!*@*@(msg.autoinstall.winsfx_ltsc2019) LTSC 2019"},
    {"_China", "@&!*@*@(msg.autoinstall.winsfx_cn) Chinese"},
    {"_Single_Language", "@&!*@*@(msg.autoinstall.winsfx_homesl) Single Language"},
    {"_Education_N", "@&!*@*@(msg.autoinstall.winsfx_edu_n) Education N"},
    {"_Education", "@&!*@*@(msg.autoinstall.winsfx_edu) Education"},
    {"_for_Workstations", "@&!*@*@(msg.autoinstall.winsfx_workstations) for Workstations"},
    {"_N_for_Workstations",
     "@&!*@*@(msg.autoinstall.winsfx_n_workstations) N for Workstations"},
    {"_for_Virtual_Desktops",
     "@&!*@*@(msg.autoinstall.winsfx_virtualDesktops) for Virtual Desktops"},
    {"V", "@&!*@*@(msg.autoinstall.winsfx_v) without Hyper-V"},
    {"CORE", "@&!*@*@(msg.autoinstall.winsfx_core) Core"},
    {"VCORE", "@&!*@*@(msg.autoinstall.winsfx_vcore) Core without Hyper-V"},
    {"K", "@&!*@*@(msg.autoinstall.winsfx_k) K"},
    {"KN", "@&!*@*@(msg.autoinstall.winsfx_kn) KN"},
};

constexpr const char *kPrettyFormat = "@&!*@*@(msg.autoinstall.prettyFormat)%s%s%s";

constexpr const char *kSupportedPrefixes[] = {
    "winXP",    "winVista", "winNet",      "longhorn",    "windows7",
    "windows8", "windows9", "windows2019", "windows2022",
};

// Trial and ESD media are recognised but never installed unattended.
constexpr GuessVersion kRefusedVersions[] = {
    GUESS_VERSION_WINDOWS_8_TRIAL, GUESS_VERSION_WINDOWS_SERVER_2012_TRIAL,
    GUESS_VERSION_WINDOWS_81_TRIAL, GUESS_VERSION_WINDOWS_SERVER_2012_R2_TRIAL,
    GUESS_VERSION_WINDOWS_10_ESD,
};

constexpr const char *kForbiddenNameChars = "/\\[]\":;|<>+=,?*";
constexpr const char *kBadWindowsName =
    "@&!*@*@(msg.autoinstall.bad_windows_name)The name must not contain the following "
    "characters:\n'/\\[]\":;|<>+=,?*'\nEnter a new value.";

// Holds one allocated text and frees it when replaced or destroyed.
class Text {
 public:
  Text() = default;
  ~Text() { std::free(p_); }
  Text(const Text &) = delete;
  Text &operator=(const Text &) = delete;
  void Reset(char *p) {
    std::free(p_);
    p_ = p;
  }
  const char *get() const { return p_; }

 private:
  char *p_ = nullptr;
};

const char *FindModifier(const char *rest) {
  for (const NameMessage &m : windowsEditionModifiers) {
    if (std::strcmp(rest, m.name) == 0) return m.message;
  }
  return nullptr;
}

char *PrettyName(const char *raw) {
  const char *space = std::strrchr(raw, ' ');
  if (space == nullptr) return UtilSafeStrdup0(raw);
  std::string base(raw, static_cast<size_t>(space - raw));
  const char *edition = space + 1;

  Text editionText, modifierText;
  for (const NameMessage &e : windowsEditionNames) {
    size_t n = std::strlen(e.name);
    if (std::strcmp(edition, e.name) == 0) {
      editionText.Reset(Msg_GetString(e.message));
      break;
    }
    if (std::strncmp(edition, e.name, n) == 0) {
      editionText.Reset(Msg_GetString(e.message));
      if (const char *m = FindModifier(edition + n)) modifierText.Reset(Msg_GetStringSafe(m));
    }
  }
  if (editionText.get() == nullptr) return UtilSafeStrdup0(raw);

  Text prefixText;
  for (const NameMessage &p : windowsPrefixNames) {
    if (base == p.name) prefixText.Reset(Msg_GetString(p.message));
  }
  if (prefixText.get() == nullptr) prefixText.Reset(UtilSafeStrdup0(base.c_str()));
  return Msg_Format(kPrettyFormat, prefixText.get(), editionText.get(),
                    modifierText.get() != nullptr ? modifierText.get() : "");
}

}  // namespace

}  // namespace tvx::autoinstall

using namespace tvx::autoinstall;

extern "C" {

TVX_EXPORT char *AutoInstall_GetPrettyWindowsName(const char *rawName) {
  if (rawName == nullptr) return nullptr;
  try {
    return PrettyName(rawName);
  } catch (...) {
    return nullptr;
  }
}

TVX_EXPORT Bool AutoInstallIsSupportedWindowsGuest(const GuessResult *guess) {
  if (guess == nullptr) return FALSE;
  for (GuessVersion v : kRefusedVersions) {
    if (guess->version == static_cast<uint32_t>(v)) return FALSE;
  }
  if (guess->guestOS == nullptr) return FALSE;
  for (const char *prefix : kSupportedPrefixes) {
    if (StrUtil_CaselessStartsWith(guess->guestOS, prefix)) return TRUE;
  }
  return FALSE;
}

TVX_EXPORT AutoInstallTextError AutoInstallValidateWindowsText(const GuessResult *guess,
                                                               const char *text, int kind,
                                                               char **out_message) {
  (void)guess;
  if (kind != AUTOINSTALL_TEXT_NAME || text == nullptr) return AUTOINSTALL_TEXT_OK;
  if (std::strpbrk(text, kForbiddenNameChars) == nullptr) return AUTOINSTALL_TEXT_OK;
  AutoInstallSetMessage(out_message, kBadWindowsName);
  return AUTOINSTALL_TEXT_BAD_WINDOWS_NAME;
}

}  // extern "C"
