// libxml2 helpers of the extended config file, shared by its reader and the
// save.
#pragma once

#include <optional>
#include <string>

#include "lib/toolsversion/toolsversion_internal.h"
#include "platform/xml_unique.h"

namespace tvx::toolsversion {

// ParseXml parses a whole document, quietly and without network access;
// null when it is not well-formed.
UniquePtr<xmlDoc> ParseXml(const char *text, size_t length);
// LoadExtendedConfig reads and parses the file and finds its root element;
// null (logged) on failure.
UniquePtr<xmlDoc> LoadExtendedConfig(const std::string &path, xmlNode **out_root);

// SavedGuestInfoFromRoot reads the saved status, else the saved manifest,
// from the root element of an extended config document.
SavedGuestInfo SavedGuestInfoFromRoot(const xmlNode *root);

// Element names compare without regard to case.
bool NameIs(const xmlNode *node, const char *name);
xmlNode *FirstElement(const xmlNode *parent);
xmlNode *FirstChildNamed(const xmlNode *parent, const char *name);
xmlNode *LastChildNamed(const xmlNode *parent, const char *name);
std::optional<std::string> Attribute(const xmlNode *node, const char *name);

}  // namespace tvx::toolsversion
