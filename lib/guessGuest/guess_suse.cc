// SUSE family install media: SUSE Linux, openSUSE (and Leap), SUSE Linux
// Enterprise Server and Desktop, Novell Linux Desktop and Sun Java Desktop.
//
// Three generations of media describe themselves differently, and the
// recogniser looks in this order of preference:
//   "content"           key/value lines ("PRODUCT SUSE SLES", "VERSION 10.2",
//                       "BASEARCHS x86_64", "REPOID obsproduct://...")
//   "media.1/products"  one line "/ <product-name> <version>"
//   the root listing    early SUSE Linux CDs mark themselves with a file
//                       named ".S.u.S.E-disk-<number>"
// A medium boots with isolinux when one of the loader directories holds
// "isolinux.cfg".
#include <cstdint>
#include <exception>
#include <optional>
#include <string>

#include "lib/guessGuest/guess_internal.h"
#include "platform/str.h"
#include "tvx_guess.h"

namespace {

using tvx::guess::StartsWith;
using tvx::guess::Contains;
using tvx::guess::Text;

// What a walk over "content" has gathered. The first PRODUCT/NAME and the
// first DEFAULTBASE/BASEARCHS win; VERSION and REPOID lines overwrite the
// numbers.
struct ContentFacts {
  std::optional<std::string> product;
  std::optional<std::string> arch;
  const char *repoId = nullptr;  // identifier named by an openSUSE 13.2 REPOID
  const char *guestOS = nullptr;
  uint32_t version = GUESS_VERSION_UNKNOWN;
  int32_t major = 0;
  int32_t minor = -1;  // -1: the VERSION line had no minor number
  bool decided = false;  // an SLE 12 REPOID settles everything at once
};

const char *Pick(bool is64, const char *id64, const char *id32) { return is64 ? id64 : id32; }

const char *SlesByMajor(int32_t major, bool is64) {
  switch (major) {
    case 10: return Pick(is64, "sles10-64", "sles10");
    case 11: return Pick(is64, "sles11-64", "sles11");
    case 12: return Pick(is64, "sles12-64", "sles12");
    default: return Pick(is64, "sles-64", "sles");
  }
}

// REPOID values are build-service URLs such as
// "obsproduct://build.suse.com/SUSE:SLE-12:GA/SLED/12/POOL/x86_64".
void ReadRepoId(const char *value, ContentFacts *facts) {
  bool is64 = Contains(value, "x86_64");
  if (Contains(value, "SLE-12")) {
    facts->guestOS = Pick(is64, "sles12-64", "sles12");
    if (Contains(value, "/SLED/")) facts->version = GUESS_VERSION_SLED_ALL;
    facts->decided = true;
  } else if (Contains(value, "openSUSE:13.2")) {
    facts->arch = is64 ? "x86_64" : "i586";
    facts->repoId = Pick(is64, "sles12-64", "sles12");
    facts->major = 13;
    facts->minor = 2;
  } else if (Contains(value, "openSUSE:Leap:42.")) {
    facts->arch = is64 ? "x86_64" : "i586";
    facts->major = 42;
  }
}

// Keys and values are separated by blanks, often a run of them to align the
// values in a column.
unsigned int SkipBlanks(const std::string &line, size_t pos) {
  while (pos < line.size() && tvx::ascii::IsSpace(line[pos])) pos++;
  return static_cast<unsigned int>(pos);
}

void ReadContentLine(const std::string &line, ContentFacts *facts) {
  size_t keyStart = line.find_first_not_of(' ');
  if (keyStart == std::string::npos) return;
  size_t keyEnd = line.find(' ', keyStart);
  if (keyEnd == std::string::npos) keyEnd = line.size();
  const char *key = line.c_str() + keyStart;
  unsigned int index = static_cast<unsigned int>(keyEnd);

  if (StartsWith(key, "REPOID")) {
    Text value(StrUtil_GetNextToken(&index, line.c_str(), " "));
    if (value) ReadRepoId(value.get(), facts);
  } else if (StartsWith(key, "PRODUCT") || StartsWith(key, "NAME")) {
    if (!facts->product) facts->product = line.substr(SkipBlanks(line, keyEnd));
  } else if (StartsWith(key, "VERSION")) {
    index = SkipBlanks(line, keyEnd);
    int32_t number = 0;
    if (StrUtil_GetNextIntToken(&number, &index, line.c_str(), ".")) facts->major = number;
    if (StrUtil_GetNextIntToken(&number, &index, line.c_str(), ".")) facts->minor = number;
  } else if (StartsWith(key, "DEFAULTBASE") || StartsWith(key, "BASEARCHS")) {
    if (facts->arch) return;
    Text word(StrUtil_GetNextToken(&index, line.c_str(), " \n"));
    if (word) facts->arch = word.get();
  }
}

uint32_t OpenSuseClass(int32_t major, int32_t minor, uint32_t version) {
  if (major <= 10) return GUESS_VERSION_OPENSUSE_11_2_OR_LOWER;
  if (major == 11) {
    return minor <= 2 ? static_cast<uint32_t>(GUESS_VERSION_OPENSUSE_11_2_OR_LOWER) : version;
  }
  if (major == 12) return GUESS_VERSION_OPENSUSE_12;
  if (major == 13 && minor == 1) return GUESS_VERSION_OPENSUSE_13_1;
  return GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER;
}

// Enterprise product names are "SUSE SLES" or "SUSE SLED": the ninth
// character tells Desktop from Server.
void EnterpriseClass(const std::string &product, ContentFacts *facts) {
  bool upToSp2 = facts->minor <= 2;
  if (product.size() > 8 && product[8] == 'D') {
    facts->version = facts->major == 10 && upToSp2 ? GUESS_VERSION_SLED_10_SP2_OR_LOWER
                                                   : GUESS_VERSION_SLED_ALL;
  } else if (facts->major == 10 && upToSp2) {
    facts->version = GUESS_VERSION_SLES_10_SP2_OR_LOWER;
  }
}

// Returns the identifier for the gathered facts, or null.
const char *FromContent(const char *text, ContentFacts *facts) {
  for (std::string_view line : tvx::guess::Lines(text)) {
    if (line.empty()) continue;
    ReadContentLine(std::string(line), facts);
    if (facts->decided) break;
  }
  if (facts->decided) return facts->guestOS;

  bool is64 = facts->arch && *facts->arch == "x86_64";
  const char *id = nullptr;
  if (!facts->product) {
    id = Pick(is64, "opensuse-64", "opensuse");
  } else {
    const std::string &product = *facts->product;
    const char *name = product.c_str();
    if (tvx::ascii::StartsWith(name, "SUSE LINUX")) {
      id = Pick(is64, "suse-64", "suse");
    } else if (tvx::ascii::StartsWith(name, "openSUSE")) {
      id = Pick(is64, "opensuse-64", "opensuse");
    } else if (StartsWith(name, "SUSE SLE") || StartsWith(name, "SUSE_SLE")) {
      id = SlesByMajor(facts->major, is64);
      EnterpriseClass(product, facts);
    } else if (StartsWith(name, "SLES-for-Tarvex")) {
      id = SlesByMajor(facts->major, is64);
    } else if (tvx::ascii::StartsWith(name, "Sun Java Desktop")) {
      id = "sjds";
    } else if (tvx::ascii::StartsWith(name, "Novell Linux Desktop")) {
      id = "nld9";
    } else {
      id = facts->repoId;
    }
  }
  if (id != nullptr && StartsWith(id, "opensuse")) {
    facts->version = OpenSuseClass(facts->major, facts->minor, facts->version);
  }
  return id;
}

// "media.1/products" begins with the medium's path ("/ ") and then names the
// product and its version.
const char *FromProducts(GuessMedium *medium, const char *text, uint32_t *version) {
  size_t skip = std::strlen(text) >= 2 ? 2 : std::strlen(text);
  const char *name = text + skip;
  *version = GUESS_VERSION_UNKNOWN;

  if (StartsWith(name, "SLES9-SLD")) return "nld9";
  if (StartsWith(name, "SLES8-SLEC-i386-SUN")) return "sjds";
  if (StartsWith(name, "SUSE-Linux-Enterprise") || StartsWith(name, "SUSE-Linux-SLES")) {
    unsigned int index = static_cast<unsigned int>(skip);
    Text productWord(StrUtil_GetNextToken(&index, text, " "));
    int32_t number = 0;
    int32_t major = StrUtil_GetNextIntToken(&number, &index, text, " \n") ? number : 0;
    if (Contains(text, "Desktop")) *version = GUESS_VERSION_SLED_ALL;
    return SlesByMajor(major, Contains(text, "x86_64"));
  }
  if (tvx::ascii::StartsWith(name, "SUSE-Linux")) {
    return Pick(Contains(text, "x86_64") || Contains(text, "x86-64"), "suse-64", "suse");
  }
  if (StartsWith(name, "openSUSE-Leap 15.") || StartsWith(name, "openSUSE 2018")) {
    *version = GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER;
    return Pick(tvx::guess::DirExists(medium, "x86_64"), "opensuse-64", "opensuse");
  }
  if (StartsWith(name, "SLES15")) return "sles15-64";
  return nullptr;
}

bool HasSuseDiskMarker(GuessMedium *medium) {
  tvx::guess::Dir root(medium, "");
  if (!root) return false;
  for (const char *name; (name = root.Next()) != nullptr;) {
    if (StartsWith(name, ".S.u.S.E-disk")) return true;
  }
  return false;
}

bool HasLoaderConfig(GuessMedium *medium) {
  for (const char *dir : {"boot/loader", "boot/i386/loader", "boot/x86_64/loader"}) {
    if (Guess_FileExists(medium, dir, "isolinux.cfg")) return true;
  }
  return false;
}

Bool Recognise(GuessMedium *medium, GuessResult *result) {
  const char *id = nullptr;
  uint32_t version = GUESS_VERSION_UNKNOWN;
  if (Text content = tvx::guess::ReadText(medium, "content")) {
    ContentFacts facts;
    id = FromContent(content.get(), &facts);
    version = facts.version;
  } else if (Text products = tvx::guess::ReadText(medium, "media.1/products")) {
    id = FromProducts(medium, products.get(), &version);
  } else if (HasSuseDiskMarker(medium)) {
    id = "suse";
  }
  if (id == nullptr) return tvx::guess::NotRecognised(result);

  result->guestOS = id;
  result->version = version;
  result->noIsolinuxConfig = HasLoaderConfig(medium) ? FALSE : TRUE;
  return TRUE;
}

}  // namespace

extern "C" TVX_EXPORT Bool Guess_SUSE(GuessMedium *medium, GuessResult *result) {
  try {
    return Recognise(medium, result);
  } catch (const std::exception &) {
    // Only allocation can throw here; the result is still untouched then.
    return tvx::guess::NotRecognised(result);
  }
}
