// Edition and language lists of image-based Windows setup media.
//
// An answer file selects an install image by name, so the host needs the
// names the medium offers. Media carry them in different ways: install_*.clg
// catalogues beside the images, an ei.cfg that pins the edition, or nothing
// at all, in which case the names follow from the release. Each list is a
// run of names, each followed by "?".
//
// lang.ini lists the UI languages as "tag = number" lines between
// "[Available UI Languages]" and "[Fallback Languages]"; the tag with the
// highest number is the medium's default language.
#include <cstdint>
#include <cstring>
#include <string>
#include <string_view>

#include "lib/guessGuest/guess_windows_vista.h"
#include "platform/str.h"

namespace tvx::guess::vista {
namespace {

constexpr size_t kEditionsWidth = sizeof(GuessResult::editions);

void SetEditions(GuessResult *result, const char *list) {
  Str_Snprintf(result->editions, sizeof result->editions, "%s", list);
}

// ---- Windows 8 and 8.1, Server 2012 and 2012 R2 ----

void ChooseEightClient(Facts &facts, bool eiListed, GuessResult *result) {
  const bool blue = facts.release == Release::kEightOne;
  const char *v = blue ? ".1" : "";
  const uint32_t plain = blue ? GUESS_VERSION_WINDOWS_81_PLAIN : GUESS_VERSION_UNKNOWN;
  if (eiListed && (facts.EiCfgHolds("Enterprise") || facts.EiCfgHolds("enterprise"))) {
    if (facts.EiCfgHolds("EnterpriseEval")) {
      // Evaluation media keep the catalogue's names.
      facts.version = blue ? GUESS_VERSION_WINDOWS_81_TRIAL : GUESS_VERSION_WINDOWS_8_TRIAL;
      return;
    }
    facts.version = blue ? GUESS_VERSION_WINDOWS_81_ENTERPRISE : GUESS_VERSION_WINDOWS_8_ENTERPRISE;
    const bool n = facts.EiCfgHolds("EnterpriseN") || facts.EiCfgHolds("enterprisen");
    Str_Snprintf(result->editions, kEditionsWidth, "Windows 8%s Enterprise%s?", v, n ? "_N" : "");
    return;
  }
  facts.version = plain;
  if (eiListed && facts.EiCfgHolds("Professional")) {
    Str_Snprintf(result->editions, kEditionsWidth, "Windows 8%s Pro%s?", v,
                 facts.EiCfgHolds("ProfessionalN") ? "_N" : "");
  } else {
    Str_Snprintf(result->editions, kEditionsWidth, "Windows 8%s Pro?Windows 8%s?", v, v);
  }
}

void ChooseEightServer(Facts &facts, bool eiListed, GuessResult *result) {
  const bool blue = facts.release == Release::kEightOne;
  const char *r = blue ? " R2" : "";
  facts.server = true;
  facts.version = blue ? GUESS_VERSION_WINDOWS_SERVER_2012_R2_PLAIN : GUESS_VERSION_UNKNOWN;
  if (eiListed && facts.EiCfgHolds("ServerHyper")) {
    facts.hyperV = true;
    return;
  }
  if (eiListed && facts.EiCfgHolds("eval") && !facts.EiCfgHolds("volume")) {
    facts.version = blue ? GUESS_VERSION_WINDOWS_SERVER_2012_R2_TRIAL
                         : GUESS_VERSION_WINDOWS_SERVER_2012_TRIAL;
    return;
  }
  Str_Snprintf(result->editions, kEditionsWidth,
               "Windows Server 2012%s SERVERSTANDARDCORE?Windows Server 2012%s SERVERSTANDARD?"
               "Windows Server 2012%s SERVERDATACENTERCORE?Windows Server 2012%s SERVERDATACENTER?",
               r, r, r, r);
}

// ---- Windows 10 clients ----

constexpr const char kHome7[] =
    "Windows 10 Home?Windows 10 Home_N?Windows 10 Home_Single_Language?Windows 10 Education?"
    "Windows 10 Education_N?Windows 10 Pro?Windows 10 Pro_N?";
constexpr const char kEducation6[] =
    "Windows 10 Education?Windows 10 Education_N?Windows 10 Enterprise?Windows 10 Enterprise_N?"
    "Windows 10 Pro?Windows 10 Pro_N?";
constexpr const char kHome11[] =
    "Windows 10 Home?Windows 10 Home_N?Windows 10 Home_Single_Language?Windows 10 Education?"
    "Windows 10 Education_N?Windows 10 Pro?Windows 10 Pro_N?Windows 10 Pro_Education?"
    "Windows 10 Pro_Education_N?Windows 10 Pro_for_Workstations?"
    "Windows 10 Pro_N_for_Workstations?";
constexpr const char kEducation10[] =
    "Windows 10 Education?Windows 10 Education_N?Windows 10 Enterprise?Windows 10 Enterprise_N?"
    "Windows 10 Pro?Windows 10 Pro_N?Windows 10 Pro_Education?Windows 10 Pro_Education_N?"
    "Windows 10 Pro_for_Workstations?Windows 10 Pro_N_for_Workstations?";
constexpr const char kEducation11[] =
    "Windows 10 Education?Windows 10 Education_N?Windows 10 Enterprise?Windows 10 Enterprise_N?"
    "Windows 10 Enterprise_for_Virtual_Desktops?Windows 10 Pro?Windows 10 Pro_N?"
    "Windows 10 Pro_Education?Windows 10 Pro_Education_N?Windows 10 Pro_for_Workstations?"
    "Windows 10 Pro_N_for_Workstations?";
constexpr const char kRetail[] =
    "Windows 10 Pro?Windows 10 Home?Windows 10 Education?Windows 10 Home_Single_Language?";
// Media for China add the Home edition made for that market.
constexpr const char kRetailChina[] =
    "Windows 10 Pro?Windows 10 Home?Windows 10 Home_China?Windows 10 Education?"
    "Windows 10 Home_Single_Language?";
constexpr const char kNList[] = "Windows 10 Pro_N?Windows 10 Home_N?Windows 10 Education_N?";

constexpr const char kAppxManifest[] =
    "sources/replacementmanifests/microsoft-windows-appx-deployment-server/appxprovisioning.xml";

void SetRetail(const Facts &facts, GuessResult *result) {
  SetEditions(result, Contains(facts.langIni(), "zh-CN") ? kRetailChina : kRetail);
}

// The N editions ship without the media apps, so their provisioning
// manifest lacks the bundled apps that retail media provision.
void ChooseTenGeneralWithoutEiCfg(const Facts &facts, GuessResult *result) {
  Text manifest = ReadText(facts.medium(), kAppxManifest);
  if (manifest && !Contains(manifest.get(), "Microsoft.SkypeApp")) {
    SetEditions(result, kNList);
  } else {
    SetRetail(facts, result);
  }
}

void ChooseTenGeneralWithEiCfg(Facts &facts, GuessResult *result) {
  const bool enterprise = facts.EiCfgHolds("Enterprise") || facts.EiCfgHolds("enterprise");
  const bool ltsb = facts.EiCfgHolds("EnterpriseS") || facts.EiCfgHolds("enterprises");
  const bool n = facts.EiCfgHolds("EnterpriseN") || facts.EiCfgHolds("enterprisen") ||
                 facts.EiCfgHolds("enterprisesn");
  facts.version = enterprise ? GUESS_VERSION_WINDOWS_10_ENTERPRISE : GUESS_VERSION_WINDOWS_10_PLAIN;
  if (enterprise) {
    const char *servicing = !ltsb                  ? ""
                            : facts.ltsb2016Naming ? "_2016_LTSB"
                                                   : "_2015_LTSB";
    Str_Snprintf(result->editions, kEditionsWidth, "Windows 10 Enterprise%s%s?", n ? "_N" : "",
                 servicing);
  } else if (n) {
    SetEditions(result, kNList);
  } else {
    SetRetail(facts, result);
  }
}

void ChooseTenClient(Facts &facts, bool eiListed, GuessResult *result) {
  facts.version = GUESS_VERSION_UNKNOWN;
  switch (facts.tenLine) {
    case TenLine::kRs3:
      SetEditions(result, eiListed ? kEducation6 : kHome7);
      return;
    case TenLine::kRs4:
    case TenLine::k19h1:
    case TenLine::kVb:
      SetEditions(result, eiListed ? kEducation10 : kHome11);
      return;
    case TenLine::kRs5:
      if (!eiListed) {
        SetEditions(result, kHome11);
      } else if (facts.EiCfgHolds("Enterprise") || facts.EiCfgHolds("enterprise")) {
        SetEditions(result, "Windows 10 Enterprise_LTSC_2019?");
      } else {
        SetEditions(result, kEducation11);
      }
      return;
    case TenLine::kGeneral:
      if (eiListed) {
        ChooseTenGeneralWithEiCfg(facts, result);
      } else {
        ChooseTenGeneralWithoutEiCfg(facts, result);
      }
      return;
  }
}

// ---- Languages ----

constexpr std::string_view kLanguagesStart = "[Available UI Languages]\r\n";
constexpr std::string_view kLanguagesEnd = "\r\n[Fallback Languages]";
constexpr size_t kLanguagesWidth = sizeof(GuessResult::languages);

}  // namespace

void CollectCatalogEditions(GuessMedium *medium, GuessResult *result) {
  constexpr std::string_view kPrefix = "install_";
  constexpr std::string_view kSuffix = ".clg";
  std::string list;
  Dir dir(medium, "sources");
  if (dir) {
    // Only the first field-width of names can be kept; a directory of many
    // thousand catalogues must not grow the list beyond that.
    for (const char *name; list.size() < kEditionsWidth && (name = dir.Next()) != nullptr;) {
      std::string_view entry(name);
      if (!StrUtil_StartsWith(name, "install_") || !StrUtil_EndsWith(name, ".clg") ||
          entry.size() < kPrefix.size() + kSuffix.size()) {
        continue;
      }
      list.append(entry.substr(kPrefix.size(), entry.size() - kPrefix.size() - kSuffix.size()));
      list += '?';
    }
  }
  CopyField(result->editions, list);
}

void ChooseEditions(Facts &facts, GuessResult *result) {
  switch (facts.release) {
    case Release::kEight:
    case Release::kEightOne: {
      const bool eiListed = facts.SourcesHold("ei.cfg");
      if (facts.SourcesHold("background_svr.bmp") || facts.server) {
        ChooseEightServer(facts, eiListed, result);
      } else {
        ChooseEightClient(facts, eiListed, result);
      }
      return;
    }
    case Release::kTen:
      if (!facts.server) {
        ChooseTenClient(facts, facts.SourcesHold("ei.cfg"), result);
        return;
      }
      break;
    default:
      break;
  }
  facts.version = GUESS_VERSION_UNKNOWN;
}

void FillLanguages(const char *langIni, GuessResult *result) {
  std::string_view text(langIni);
  size_t start = text.find(kLanguagesStart);
  size_t end = start == std::string_view::npos
                   ? std::string_view::npos
                   : text.find(kLanguagesEnd, start + kLanguagesStart.size());
  if (end == std::string_view::npos) {
    SetDefaultLanguage(result);
    return;
  }
  std::string_view section = text.substr(start + kLanguagesStart.size(),
                                         end - start - kLanguagesStart.size());

  std::string list;
  std::string best;
  int64_t bestNumber = -1;
  bool complete = true;
  while (!section.empty()) {
    size_t eol = section.find("\r\n");
    std::string line(section.substr(0, eol));
    section.remove_prefix(eol == std::string_view::npos ? section.size() : eol + 2);
    if (line.empty()) continue;

    char *rawKey = nullptr;
    char *rawValue = nullptr;
    if (!GuessParseKeyValue(line.c_str(), &rawKey, &rawValue)) continue;
    Text key(rawKey);
    Text value(rawValue);
    int32_t number = 0;
    if (!StrUtil_StrToInt(&number, value.get())) {
      complete = false;
      break;
    }
    if (number > bestNumber) {
      bestNumber = number;
      best = key.get();
    }
    if (list.size() < kLanguagesWidth) {
      list += key.get();
      list += '?';
    }
  }
  if (complete) CopyField(result->languages, list);
  CopyField(result->language, bestNumber < 0 ? std::string_view("en-US") : std::string_view(best));
  CopyField(result->languageShort, result->language);
}

}  // namespace tvx::guess::vista
