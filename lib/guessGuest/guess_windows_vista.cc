// Recogniser of image-based Windows setup media (Windows Vista / Server 2008
// up to Windows 11 / Server 2022).
//
// Such a medium names its build branch and architecture in
// sources/idwbinfo.txt and its UI languages in sources/lang.ini. The branch
// gives the release family; marker files refine it (a server background
// bitmap, a NanoServer folder, ei.cfg naming the edition, install.esd for
// media made by the download tool), and the architecture picks the
// identifier. Hosts key product behaviour on the exact identifier and version
// class, so the order of the branch rules below is significant: the first
// rule that holds decides.
#include "lib/guessGuest/guess_windows_vista.h"

#include <cstring>

#include "platform/msg.h"
#include "platform/str.h"

namespace tvx::guess::vista {

bool Facts::SourcesHold(const char *prefix) const {
  return Guess_FileExistsWithPrefix(medium_, "sources", prefix);
}

bool Facts::NanoServerReadMe() const {
  return Guess_FileExistsWithPrefix(medium_, "NanoServer", "ReadMe.txt");
}

const char *Facts::EiCfg() {
  if (!eiCfgRead_) {
    eiCfg_ = ReadText(medium_, "sources/ei.cfg");
    eiCfgRead_ = true;
  }
  return eiCfg_.get();
}

void SetDefaultLanguage(GuessResult *result) {
  CopyField(result->language, "en-US");
  CopyField(result->languageShort, "en-US");
}

namespace {

constexpr const char kServer2012R2List[] =
    "Windows Server 2012 R2 SERVERSTANDARDCORE?Windows Server 2012 R2 SERVERSTANDARD?"
    "Windows Server 2012 R2 SERVERDATACENTERCORE?Windows Server 2012 R2 SERVERDATACENTER?";
constexpr const char kServer2016PreviewList[] =
    "Windows Server 2016 Technical Preview 5 SERVERSTANDARDCORE?"
    "Windows Server 2016 Technical Preview 5 SERVERSTANDARD?"
    "Windows Server 2016 Technical Preview 5 SERVERDATACENTERCORE?"
    "Windows Server 2016 Technical Preview 5 SERVERDATACENTER?";
constexpr const char kServer2016PreviewSolutionList[] =
    "Windows Server 2016 Technical Preview 5 SERVERSOLUTION?";
constexpr const char kServer2016List[] =
    "Windows Server 2016 SERVERSTANDARDCORE?Windows Server 2016 SERVERSTANDARD?"
    "Windows Server 2016 SERVERDATACENTERCORE?Windows Server 2016 SERVERDATACENTER?";
constexpr const char kServer2016EssentialsList[] =
    "Windows Server 2016 SERVERSOLUTION?Windows Server 2016 SERVERSTORAGESTANDARD?"
    "Windows Server 2016 SERVERSTORAGEWORKGROUP?";
constexpr const char kServer2016SemiAnnualList[] =
    "Windows Server 2016 SERVERSTANDARDACORE?Windows Server 2016 SERVERDATACENTERACORE?";
constexpr const char kServerSemiAnnualList[] =
    "Windows Server SERVERSTANDARDACORE?Windows Server SERVERDATACENTERACORE?";
constexpr const char kServer2019List[] =
    "Windows Server 2019 SERVERSTANDARDCORE?Windows Server 2019 SERVERSTANDARD?"
    "Windows Server 2019 SERVERDATACENTERCORE?Windows Server 2019 SERVERDATACENTER?";
constexpr const char kServer2022List[] =
    "Windows Server 2022 SERVERSTANDARDCORE?Windows Server 2022 SERVERSTANDARD?"
    "Windows Server 2022 SERVERDATACENTERCORE?Windows Server 2022 SERVERDATACENTER?";

void SetEditions(GuessResult *result, const char *list) {
  Str_Snprintf(result->editions, sizeof result->editions, "%s", list);
}

// A server build of a semi-annual branch ships the background bitmap that
// client builds of the same branch lack.
bool ServerBuild(const Facts &facts) { return facts.SourcesHold("background_svr.bmp"); }

void SetTen(Facts &facts, TenLine line, bool ltsb2016Naming) {
  facts.release = Release::kTen;
  facts.tenLine = line;
  facts.ltsb2016Naming = ltsb2016Naming;
}

// ClassifyBranch sets the release (and the flags that go with it) from the
// build branch; some rules also fix the edition list of server media.
void ClassifyBranch(Facts &facts, const char *branch, GuessResult *result) {
  auto starts = [branch](const char *prefix) { return StrUtil_StartsWith(branch, prefix) != 0; };
  auto has = [branch](const char *needle) { return Contains(branch, needle); };

  if (starts("vista") || starts("lh_sp2rtm")) {
    facts.release = Release::kVista;
  } else if (has("win7")) {
    facts.release = Release::kSeven;
  } else if (has("win8_rtm")) {
    facts.release = Release::kEight;
  } else if (starts("winblue_")) {
    facts.release = Release::kEightOne;
  } else if (starts("winmain")) {
    facts.release = Release::kNone;
  } else if (facts.SourcesHold("install_Windows Vista")) {
    facts.release = Release::kVista;
  } else if (facts.SourcesHold("install_Windows 7")) {
    facts.release = Release::kSeven;
  } else if (starts("win") || has("th1") || has("th2_release")) {
    SetTen(facts, TenLine::kGeneral, false);
  } else if (starts("fbl_") || starts("th2_")) {
    SetEditions(result, kServer2012R2List);
    SetTen(facts, TenLine::kGeneral, false);
    facts.server = true;
  } else if (starts("rs1_release_svc")) {
    SetEditions(result, facts.NanoServerReadMe() ? kServer2016PreviewList
                                                 : kServer2016PreviewSolutionList);
    facts.release = Release::kServer2016;
  } else if (starts("rs1_release")) {
    if (facts.EiCfgHolds("ServerHyper")) {
      facts.release = Release::kServer2016;
      facts.hyperV = true;
    } else if (facts.NanoServerReadMe()) {
      SetEditions(result, kServer2016List);
      facts.release = Release::kServer2016;
    } else if (ServerBuild(facts)) {
      SetEditions(result, kServer2016EssentialsList);
      facts.release = Release::kServer2016;
    } else {
      SetTen(facts, TenLine::kGeneral, true);
    }
  } else if (starts("rs1_") || starts("rs2_release")) {
    SetTen(facts, TenLine::kGeneral, true);
  } else if (starts("rs3_release") || starts("rs4_release")) {
    if (ServerBuild(facts)) {
      SetEditions(result, kServer2016SemiAnnualList);
      facts.release = Release::kServer2016;
    } else {
      SetTen(facts, starts("rs3_release") ? TenLine::kRs3 : TenLine::kRs4, true);
    }
  } else if (starts("rs5_release")) {
    if (ServerBuild(facts)) {
      SetEditions(result, facts.EiCfg() != nullptr ? kServerSemiAnnualList : kServer2019List);
      facts.release = Release::kServer2019;
    } else {
      SetTen(facts, TenLine::kRs5, true);
    }
  } else if (starts("19h1_release")) {
    SetTen(facts, TenLine::k19h1, false);
  } else if (starts("vb_release") || starts("20h1_release") || starts("2004_release")) {
    if (ServerBuild(facts)) {
      SetEditions(result, kServerSemiAnnualList);
      facts.release = Release::kServer2019;
    } else {
      SetTen(facts, TenLine::kVb, false);
    }
  } else if (has("fe_release")) {
    SetEditions(result, kServer2022List);
    facts.release = Release::kServer2022;
  } else if (starts("co_release") || starts("ni_release")) {
    facts.release = Release::kEleven;
  }
}

enum class Arch { kAmd64, kArm64, kOther };

// Identifier picks the guest-OS identifier for the release and architecture;
// for Windows 10 it also applies the download-tool (ESD) class.
const char *Identifier(Facts &facts, Arch arch) {
  const bool amd64 = arch == Arch::kAmd64;
  switch (facts.release) {
    case Release::kVista:
      if (facts.server) return amd64 ? "longhorn-64" : "longhorn";
      return amd64 ? "winVista-64" : "winVista";
    case Release::kSeven:
      if (facts.server) return "windows7srv-64";
      return amd64 ? "windows7-64" : "windows7";
    case Release::kEight:
    case Release::kEightOne:
      if (facts.hyperV) return "winHyperV";
      if (facts.server) return "windows8srv-64";
      return amd64 ? "windows8-64" : "windows8";
    case Release::kTen:
      if (arch == Arch::kArm64) return "arm-windows9-64";
      if (facts.esd) facts.version = GUESS_VERSION_WINDOWS_10_ESD;
      return amd64 ? "windows9-64" : "windows9";
    case Release::kServer2016:
      return facts.hyperV ? "winHyperV" : "windows9srv-64";
    case Release::kServer2019:
      return "windows2019srv-64";
    case Release::kServer2022:
      return "windows2019srvNext-64";
    case Release::kEleven:
      return arch == Arch::kArm64 ? "arm-windows11-64" : "windows11-64";
    case Release::kNone:
      return amd64 ? "longhorn-64" : "longhorn";
  }
  GUESS_NOT_REACHED();
}

// Windows 8.1 and Server 2012 R2 are shown under a name of their own rather
// than the identifier's name plus a version text.
void SetDisplayName(const Facts &facts, GuessResult *result) {
  if (facts.release != Release::kEightOne || facts.hyperV) return;
  const char *id = facts.server ? "@&!*@*@(msg.guessGuest.winServer2012R2.altName)Windows Server 2012 R2"
                   : facts.is64 ? "@&!*@*@(msg.guessGuest.win8dot1x64.altName)Windows 8.1 x64"
                                : "@&!*@*@(msg.guessGuest.win8dot1.altName)Windows 8.1";
  Text name(Msg_GetString(id));
  if (name) CopyField(result->displayName, name.get());
}

Bool Recognise(GuessMedium *medium, GuessResult *result) {
  Text productIni = ReadText(medium, "sources/product.ini");
  Text idwbInfo = ReadText(medium, "sources/idwbinfo.txt");
  Text langIni = ReadText(medium, "sources/lang.ini");
  if (!idwbInfo || !langIni) {
    SetDefaultLanguage(result);
    return NotRecognised(result);
  }
  Facts facts(medium, langIni.get());

  CollectCatalogEditions(medium, result);

  if (const char *type = std::strstr(productIni.get() != nullptr ? productIni.get() : "", "Type=")) {
    Text value = ParsedValue(type);
    facts.server = Contains(value.get(), "Server");
  }

  if (const char *entry = std::strstr(idwbInfo.get(), "BuildBranch=")) {
    if (Text branch = ParsedValue(entry)) ClassifyBranch(facts, branch.get(), result);
  }

  ChooseEditions(facts, result);
  if (facts.release == Release::kNone && !facts.server) {
    SetDefaultLanguage(result);
    return NotRecognised(result);
  }

  if (facts.release == Release::kTen) facts.esd = facts.SourcesHold("install.esd");

  const char *guestOS = nullptr;
  if (const char *entry = std::strstr(idwbInfo.get(), "BuildArch=")) {
    Text value = ParsedValue(entry);
    Arch arch = Arch::kOther;
    if (value && std::strcmp(value.get(), "amd64") == 0) arch = Arch::kAmd64;
    if (value && std::strcmp(value.get(), "arm64") == 0) arch = Arch::kArm64;
    facts.is64 = arch == Arch::kAmd64;
    guestOS = Identifier(facts, arch);
    FillLanguages(langIni.get(), result);
    result->guestOS = guestOS;
    result->version = facts.version;
  } else {
    SetDefaultLanguage(result);
  }

  SetDisplayName(facts, result);
  return NotRecognised(result);
}

}  // namespace
}  // namespace tvx::guess::vista

extern "C" TVX_EXPORT Bool Guess_WindowsVistaAndNewer(GuessMedium *medium, GuessResult *result) {
  try {
    return tvx::guess::vista::Recognise(medium, result);
  } catch (...) {
    // Only allocation can throw here; a medium we could not finish reading
    // is one we do not recognise.
    tvx::guess::vista::SetDefaultLanguage(result);
    return tvx::guess::NotRecognised(result);
  }
}
