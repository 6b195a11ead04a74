// Working state of one recognition of an image-based Windows setup medium,
// shared by the branch classification (guess_windows_vista.cc) and the
// edition and language lists (guess_windows_vista_lists.cc).
#pragma once

#include <cstdint>

#include "lib/guessGuest/guess_internal.h"

namespace tvx::guess::vista {

// The release family the build branch names; kNone when the branch is
// unknown (a server medium of an unknown branch is still recognised).
enum class Release {
  kNone,
  kVista,
  kSeven,
  kEight,
  kEightOne,
  kTen,
  kServer2016,
  kServer2019,
  kServer2022,
  kEleven,
};

// Client Windows 10 builds differ in the editions that one image offers;
// each value names one rule for the edition list.
enum class TenLine { kGeneral, kRs3, kRs4, kRs5, k19h1, kVb };

// Facts gathers what one recognition has learnt about the medium. Probes of
// the sources directory and the reading of ei.cfg are done on demand and
// remembered, since several rules ask the same question.
class Facts {
 public:
  Facts(GuessMedium *medium, const char *langIni) : medium_(medium), langIni_(langIni) {}
  Facts(const Facts &) = delete;
  Facts &operator=(const Facts &) = delete;

  GuessMedium *medium() const { return medium_; }
  // The whole of sources/lang.ini (never null).
  const char *langIni() const { return langIni_; }

  // SourcesHold: some entry of "sources" starts with `prefix`, case ignored.
  bool SourcesHold(const char *prefix) const;
  bool NanoServerReadMe() const;
  // EiCfg returns the text of sources/ei.cfg, or null when it cannot be read.
  const char *EiCfg();
  // EiCfgHolds: ei.cfg reads and contains `word` (case counts).
  bool EiCfgHolds(const char *word) { return Contains(EiCfg(), word); }

  Release release = Release::kNone;
  TenLine tenLine = TenLine::kGeneral;
  bool server = false;
  bool hyperV = false;
  // Long-term-servicing editions of these branches are named after 2016.
  bool ltsb2016Naming = false;
  bool is64 = false;
  bool esd = false;
  uint32_t version = GUESS_VERSION_UNKNOWN;

 private:
  GuessMedium *medium_;
  const char *langIni_;
  bool eiCfgRead_ = false;
  Text eiCfg_;
};

// CollectCatalogEditions writes `editions` from the install_*.clg catalogue
// names in sources (the list later rules may overwrite).
void CollectCatalogEditions(GuessMedium *medium, GuessResult *result);

// ChooseEditions sets facts.version and, where the release's rules say so,
// `editions`, for the classes whose editions depend on ei.cfg and friends.
void ChooseEditions(Facts &facts, GuessResult *result);

// FillLanguages writes `languages`, `language` and `languageShort` from the
// "[Available UI Languages]" section of lang.ini.
void FillLanguages(const char *langIni, GuessResult *result);

// SetDefaultLanguage writes "en-US" into `language` and `languageShort`, the
// answer for every medium this recogniser does not know.
void SetDefaultLanguage(GuessResult *result);

}  // namespace tvx::guess::vista
