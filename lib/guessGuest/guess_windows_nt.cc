// Windows media up to Windows Server 2003: the NT family, told apart by the
// product name in the text-mode setup information file, and Windows 95/98/Me,
// told apart by their top-level setup directories. Also the entry parser the
// Windows recognisers share for INI-like setup files.
#include <cstring>

#include "lib/guessGuest/guess_internal.h"
#include "platform/str.h"
#include "platform/util.h"

namespace {

using tvx::guess::Contains;
using tvx::guess::Dir;
using tvx::guess::NotRecognised;
using tvx::guess::ParsedValue;
using tvx::guess::ReadText;
using tvx::guess::Recognised;
using tvx::guess::Text;

struct NtProduct {
  const char *name;  // as the setup file states it, case and all
  const char *guestOS;
};

// Windows XP is missing on purpose: its many editions are told by words in
// the name rather than listed.
constexpr NtProduct kNtProducts[] = {
    {"Windows Server 2003, Standard", "winNetStandard"},
    {"Windows Server 2003, Enterprise", "winNetEnterprise"},
    {"Windows Server 2003, Web", "winNetWeb"},
    {"Windows Server 2003 Standard x64 Edition", "winNetStandard-64"},
    {"Windows Server 2003 Enterprise x64 Edition", "winNetEnterprise-64"},
    {"Windows Server 2003 for Small Business Server", "winNetBusiness"},
    {"Microsoft Windows 2000 Professional", "win2000Pro"},
    {"Microsoft Windows 2000 Server", "win2000Serv"},
    {"Microsoft Windows 2000 Advanced Server", "win2000AdvServ"},
    {"Windows NT Workstation Version 4.00", "winNT"},
    {"Windows NT Server Version 4.00", "winNT"},
};

struct LegacyDir {
  const char *dir;
  const char *guestOS;
};

// Probed in this order, the last directory present winning: a Windows Me
// medium also carries win95 and win98 trees for its upgrade paths, and a
// Windows 98 medium a win95 one.
constexpr LegacyDir kLegacyDirs[] = {
    {"win98", "win98"},
    {"win95", "win95"},
    {"win9x", "winMe"},
};

bool IsValueSpace(char c) {
  return c == ' ' || c == '\t' || c == '\r' || c == '\n' || c == '\v' || c == '\f';
}

bool EndsValue(char c) {
  auto u = static_cast<unsigned char>(c);
  return u == '\0' || u == '"' || u < 0x20 || u == 0x7F;
}

char *CopyRange(const char *begin, const char *end) {
  auto n = static_cast<size_t>(end - begin);
  auto *out = static_cast<char *>(UtilSafeMalloc0(n + 1));
  std::memcpy(out, begin, n);
  out[n] = '\0';
  return out;
}

// XpIdentifier tells a Windows XP product name (lower-cased) by its words:
// "Professional" and "Professional x64 Edition" contain "pro"; Home, Media
// Center and Tablet PC editions do not and install as Home.
const char *XpIdentifier(const char *lowerName) {
  if (!Contains(lowerName, "windows xp")) return nullptr;
  if (!Contains(lowerName, "pro")) return "winXPHome";
  return Contains(lowerName, "x64") ? "winXPPro-64" : "winXPPro";
}

const char *NtIdentifier(char *productName) {
  for (const NtProduct &p : kNtProducts) {
    if (std::strcmp(productName, p.name) == 0) return p.guestOS;
  }
  Str_ToLower(productName);
  return XpIdentifier(productName);
}

}  // namespace

extern "C" {

TVX_EXPORT Bool GuessParseKeyValue(const char *text, char **out_key, char **out_value) {
  if (out_key != nullptr) *out_key = nullptr;
  if (out_value == nullptr) return FALSE;
  *out_value = nullptr;
  if (text == nullptr) return FALSE;
  const char *eq = std::strchr(text, '=');
  if (eq == nullptr) return FALSE;

  // Setup files put blanks around "=", quote some values, and leave some
  // empty; an empty one runs on into whatever the next line holds.
  const char *p = eq + 1;
  while (IsValueSpace(*p)) ++p;
  if (*p == '"') {
    ++p;
    if (*p == '\0' || *p == '"') return FALSE;
  }
  if (*p == '\0') return FALSE;

  // Blanks belong to the value ("Windows Server 2003, Standard"); a quote or
  // any control character ends it.
  const char *end = p;
  while (!EndsValue(*end)) ++end;
  if (end == p) return FALSE;

  if (out_key != nullptr) {
    const char *blank = static_cast<const char *>(
        std::memchr(text, ' ', static_cast<size_t>(eq - text)));
    *out_key = CopyRange(text, blank != nullptr ? blank : eq);
  }
  *out_value = CopyRange(p, end);
  return TRUE;
}

TVX_EXPORT Bool Guess_WindowsNT(GuessMedium *medium, GuessResult *result) {
  Text setup = ReadText(medium, "I386/TXTSETUP.SIF");
  Text prodspec = ReadText(medium, "I386/PRODSPEC.INI");
  // 64-bit media keep their text-mode setup under AMD64 alone.
  if (setup == nullptr) {
    setup = ReadText(medium, "AMD64/TXTSETUP.SIF");
    if (setup == nullptr) return NotRecognised(result);
  }
  if (prodspec == nullptr) prodspec = ReadText(medium, "AMD64/PRODSPEC.INI");

  // Workstation media state their product in wks_id, server media in
  // srv_id; some carry both, and then wks_id names the medium.
  const char *entry = std::strstr(setup.get(), "wks_id ");
  if (entry == nullptr) entry = std::strstr(setup.get(), "srv_id ");
  if (entry == nullptr) return NotRecognised(result);
  Text product = ParsedValue(entry);
  if (product == nullptr) return NotRecognised(result);

  const char *guestOS = NtIdentifier(product.get());
  if (guestOS == nullptr) return NotRecognised(result);

  if (prodspec != nullptr) {
    const char *loc = std::strstr(prodspec.get(), "Localization=");
    Text language = loc != nullptr ? ParsedValue(loc) : Text();
    if (language != nullptr) tvx::guess::CopyField(result->language, language.get());
  }
  return Recognised(result, guestOS, GUESS_VERSION_UNKNOWN);
}

TVX_EXPORT Bool Guess_WindowsLegacy(GuessMedium *medium, GuessResult *result) {
  const char *candidate = nullptr;
  for (const LegacyDir &d : kLegacyDirs) {
    Dir dir(medium, d.dir);
    if (dir) candidate = d.guestOS;
  }
  if (candidate == nullptr) return NotRecognised(result);
  return Recognised(result, candidate, GUESS_VERSION_UNKNOWN);
}

}  // extern "C"
