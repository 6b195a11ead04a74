// Install media of the Tarvex Orka and Orkai hypervisors ("zelcore" family).
//
// Orka media list their build in "packages.xml":
//   <iso_build><product><name>Tarvex Orka Server</name>
//              <orka_version>4.1.0</orka_version>...</product>...</iso_build>
// Orkai media are told apart by the title of their isolinux boot menu.

#include <climits>
#include <cstring>
#include <exception>
#include <optional>
#include <string>

#include "lib/guessGuest/guess_internal.h"
#include "platform/xml_unique.h"
#include "tvx_guess.h"

namespace {

using tvx::guess::Contains;
using tvx::guess::Text;

bool Named(const xmlNode *node, const char *name) {
  return tvx::Xml().xmlStrEqual(node->name, reinterpret_cast<const xmlChar *>(name)) != 0;
}

// The text of <name> or <orka_version>: an element whose first child is not
// text has none, an empty text node gives an empty text.
std::optional<std::string> ElementText(const xmlNode *element) {
  const xmlNode *first = element->children;
  if (first == nullptr || first->type != XML_TEXT_NODE) return std::nullopt;
  return std::string(first->content ? reinterpret_cast<const char *>(first->content) : "");
}

bool IsOrkaBuild(const char *text) {
  size_t length = std::strlen(text);
  if (length > INT_MAX) return false;
  // The file comes from an untrusted image: no network, no external DTD, no
  // entity substitution, and no messages on the host's standard error.
  const tvx::XmlApi *xml = tvx::LoadXml();
  if (xml == nullptr) return false;
  tvx::UniquePtr<xmlDoc> doc(xml->xmlReadMemory(text, static_cast<int>(length), "packages.xml", nullptr,
                                 XML_PARSE_NONET | XML_PARSE_NOERROR | XML_PARSE_NOWARNING));
  if (!doc) return false;
  const xmlNode *root = xml->xmlDocGetRootElement(doc.get());
  if (root == nullptr || !Named(root, "iso_build")) return false;
  const xmlNode *product = root->children;
  while (product != nullptr && !Named(product, "product")) product = product->next;
  if (product == nullptr) return false;

  std::optional<std::string> name;
  std::optional<std::string> version;
  for (const xmlNode *child = product->children; child != nullptr && !(name && version);
       child = child->next) {
    if (child->type != XML_ELEMENT_NODE) continue;
    if (Named(child, "name")) name = ElementText(child);
    if (Named(child, "orka_version")) version = ElementText(child);
  }
  return name && version && tvx::ascii::StartsWith(name->c_str(), "Tarvex Orka") &&
         tvx::ascii::StartsWith(version->c_str(), "4.");
}

struct MenuRow {
  const char *title;
  const char *guestOS;
};

// Searched in this order: "Orkai-6.0" must win over its prefix "Orkai-6".
constexpr MenuRow kMenuRows[] = {
    {"menu title Tarvex Hyperlet", "zelcore"},
    {"MENU TITLE Orkai-5", "zelcore5"},
    {"MENU TITLE Orkai-6.0", "zelcore6"},
    {"MENU TITLE Skyvault-6.0", "zelcore6"},
    {"MENU TITLE Orkai-6", "zelcore65"},
    {"MENU TITLE Skyvault-6", "zelcore65"},
};

// 7.0 media exist for x86-64 and for Arm; the Arm ones (only an Arm EFI
// loader) are not for this identifier.
const char *Release7(GuessMedium *medium, const char *config) {
  if (!Contains(config, "MENU TITLE Orkai-7.0") && !Contains(config, "MENU TITLE Skyvault-7.0")) {
    return nullptr;
  }
  bool armOnly = Guess_FileExists(medium, "EFI/BOOT", "BOOTAA64.EFI") &&
                 !Guess_FileExists(medium, "EFI/BOOT", "BOOTX64.EFI");
  return armOnly ? nullptr : "zelcore7";
}

}  // namespace

extern "C" TVX_EXPORT Bool Guess_Orka(GuessMedium *medium, GuessResult *result) {
  Text packages = tvx::guess::ReadText(medium, "packages.xml");
  if (!packages) return tvx::guess::NotRecognised(result);
  bool orka = false;
  try {
    orka = IsOrkaBuild(packages.get());
  } catch (const std::exception &) {
    orka = false;  // allocation failure while copying element texts
  }
  if (!orka) return tvx::guess::NotRecognised(result);
  result->guestOS = "zelcore";
  result->version = GUESS_VERSION_UNKNOWN;
  return TRUE;
}

extern "C" TVX_EXPORT Bool Guess_Orkai(GuessMedium *medium, GuessResult *result) {
  Text config = tvx::guess::ReadText(medium, "isolinux.cfg");
  if (!config) return FALSE;
  const char *id = nullptr;
  for (const MenuRow &row : kMenuRows) {
    if (Contains(config.get(), row.title)) {
      id = row.guestOS;
      break;
    }
  }
  if (id == nullptr) id = Release7(medium, config.get());
  config.reset();
  if (id != nullptr) result->guestOS = id;
  if (result->guestOS == nullptr) return FALSE;
  result->version = GUESS_VERSION_UNKNOWN;
  return TRUE;
}
