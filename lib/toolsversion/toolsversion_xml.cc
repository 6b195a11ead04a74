// The extended config file: an XML document beside the machine's
// configuration that keeps what the host last learned about the guest tools.
//
//   <anyRoot>
//     <tools-manifest> <monolithic version="12.1.0"/> <netdriver version=".." installed="TRUE"/>
//     <update-agent-info> <tools> <monolithic guestVersion=".." repoVersion=".." status="3"/>
//     <tools-install-info> <installError>-1</installError> <updateCounter>3</updateCounter>
//
// This file finds and reads it and turns what it keeps into a saved status
// or a guest manifest; toolsversion_save.cc merges new reports into it.
#include "lib/toolsversion/toolsversion_xml.h"


#include <cstring>

#include "platform/ascii.h"
#include "platform/fileio.h"
#include "platform/str.h"

namespace tvx::toolsversion {

// Config files larger than this are refused as not being config files.
constexpr uint64_t kMaxExtendedConfigSize = 2147483647;

UniquePtr<xmlDoc> ParseXml(const char *text, size_t length) {
  const XmlApi *xml = LoadXml();
  if (xml == nullptr || length > static_cast<size_t>(INT32_MAX)) return nullptr;
  return UniquePtr<xmlDoc>(
      xml->xmlReadMemory(text, static_cast<int>(length), nullptr, nullptr,
                    XML_PARSE_NONET | XML_PARSE_NOERROR | XML_PARSE_NOWARNING));
}

bool NameIs(const xmlNode *node, const char *name) {
  return node->type == XML_ELEMENT_NODE &&
         ascii::Equal(reinterpret_cast<const char *>(node->name), name);
}

xmlNode *FirstElement(const xmlNode *parent) {
  for (xmlNode *n = parent->children; n != nullptr; n = n->next) {
    if (n->type == XML_ELEMENT_NODE) return n;
  }
  return nullptr;
}

xmlNode *FirstChildNamed(const xmlNode *parent, const char *name) {
  for (xmlNode *n = parent->children; n != nullptr; n = n->next) {
    if (NameIs(n, name)) return n;
  }
  return nullptr;
}

xmlNode *LastChildNamed(const xmlNode *parent, const char *name) {
  xmlNode *last = nullptr;
  for (xmlNode *n = parent->children; n != nullptr; n = n->next) {
    if (NameIs(n, name)) last = n;
  }
  return last;
}

std::optional<std::string> Attribute(const xmlNode *node, const char *name) {
  XmlChars value(tvx::Xml().xmlGetProp(node, reinterpret_cast<const xmlChar *>(name)));
  if (value == nullptr) return std::nullopt;
  return std::string(reinterpret_cast<const char *>(value.get()));
}

std::string ExtendedConfigPath(const char *configPath, const Dictionary *config) {
  CharPtr name(Dict_GetString(config, nullptr, "extendedConfigFile"));
  if (name == nullptr) {
    TV_LOG("Error getting extended config name from config file.\n");
    return "";
  }
  const char *slash = configPath != nullptr ? std::strrchr(configPath, '/') : nullptr;
  if (name.get()[0] == '/' || slash == nullptr) return name.get();
  return std::string(configPath, slash + 1) + name.get();
}

bool ReadExtendedConfig(const std::string &path, std::string *out) {
  FileIODescriptor fd;
  FileIO_Invalidate(&fd);
  FileIOResult rc = FileIO_Open(&fd, path.c_str(), FILEIO_OPEN_ACCESS_READ, FILEIO_OPEN);
  if (rc != FILEIO_SUCCESS) {
    TV_LOG("Error opening extended config file for reading: errcode %d.\n", rc);
    return false;
  }
  bool ok = false;
  uint64_t size = FileIO_GetSize(&fd);
  if (size > kMaxExtendedConfigSize) {
    TV_LOG("Error getting size of extended config file.\n");
  } else {
    out->assign(size, '\0');
    rc = FileIO_Read(&fd, out->data(), size, nullptr);
    if (rc != FILEIO_SUCCESS) {
      TV_LOG("Error reading from extended config file: errcode %d.\n", rc);
    } else {
      ok = true;
    }
  }
  FileIO_Close(&fd);
  if (!ok) out->clear();
  return ok;
}

UniquePtr<xmlDoc> LoadExtendedConfig(const std::string &path, xmlNode **out_root) {
  std::string text;
  if (!ReadExtendedConfig(path, &text)) {
    TV_LOG("Failed to get xml buffer from extended config file.\n");
    return nullptr;
  }
  UniquePtr<xmlDoc> doc = ParseXml(text.data(), text.size());
  if (doc == nullptr) {
    TV_LOG("Error parsing xml from extended config file.\n");
    return nullptr;
  }
  *out_root = tvx::Xml().xmlDocGetRootElement(doc.get());
  if (*out_root == nullptr) {
    TV_LOG("Failed to find root in extended config xml.\n");
    return nullptr;
  }
  return doc;
}

namespace {

// SavedStatus: the "status" the update agent reported for the monolithic
// tools (0 when absent or not a number).
uint32_t SavedStatus(const xmlNode *root) {
  const xmlNode *tools = nullptr;
  for (const xmlNode *n = root->children; n != nullptr; n = n->next) {
    if (!NameIs(n, "update-agent-info")) continue;
    if (const xmlNode *t = FirstChildNamed(n, "tools")) tools = t;
  }
  const xmlNode *mono = tools != nullptr ? FirstChildNamed(tools, "monolithic") : nullptr;
  if (mono == nullptr) return 0;
  std::optional<std::string> status = Attribute(mono, "status");
  uint32_t value = 0;
  if (!status || !StrUtil_StrToUint(&value, status->c_str())) return 0;
  return value;
}

DictPtr SavedManifest(const xmlNode *manifest) {
  DictPtr dict(Dictionary_Create());
  for (const xmlNode *n = manifest->children; n != nullptr; n = n->next) {
    if (n->type != XML_ELEMENT_NODE) continue;
    const char *name = reinterpret_cast<const char *>(n->name);
    std::optional<std::string> version = Attribute(n, "version");
    if (!version) continue;
    if (std::strcmp(name, "monolithic") == 0) {
      Dict_SetString(dict.get(), version->c_str(), "%s.version", name);
      continue;
    }
    std::optional<std::string> installed = Attribute(n, "installed");
    if (!installed) continue;
    Dict_SetString(dict.get(), version->c_str(), "%s.version", name);
    Dict_SetBool(dict.get(), ascii::Equal(*installed, "TRUE"), "%s.installed", name);
  }
  return dict;
}

}  // namespace

SavedGuestInfo SavedGuestInfoFromRoot(const xmlNode *root) {
  SavedGuestInfo info;
  if (FirstElement(root) == nullptr) {
    TV_LOG("Failed to find manifest content in extended config xml.\n");
    return info;
  }
  uint32_t status = SavedStatus(root);
  if (status != 0 && status != TOOLS_STATUS_UNKNOWN) {
    info.status = status;
    return info;
  }
  const xmlNode *manifest = LastChildNamed(root, "tools-manifest");
  if (manifest == nullptr || FirstElement(manifest) == nullptr) {
    TV_LOG("Failed to find manifest content in extended config xml.\n");
    return info;
  }
  info.manifest = SavedManifest(manifest);
  return info;
}

SavedGuestInfo ReadSavedGuestInfo(const char *configPath, const Dictionary *config) {
  std::string path = ExtendedConfigPath(configPath, config);
  if (path.empty()) {
    TV_LOG("Error getting extended config file path.\n");
    return {};
  }
  xmlNode *root = nullptr;
  UniquePtr<xmlDoc> doc = LoadExtendedConfig(path, &root);
  if (doc == nullptr) return {};
  return SavedGuestInfoFromRoot(root);
}

}  // namespace tvx::toolsversion
