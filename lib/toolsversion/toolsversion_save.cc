// ToolsVersion_SaveXmlInfo: merges the guest's reports into the existing
// extended config file and rewrites it whole. The document is edited in
// memory; the file changes only at the very end, through the crash-safe
// replace, so any failure before or during the write leaves it as it was.

#include <cerrno>
#include <cstring>

#include "lib/toolsversion/toolsversion_xml.h"
#include "platform/ascii.h"
#include "platform/fd_io.h"
#include "platform/file_replace.h"
#include "platform/msg.h"
#include "platform/msglist.h"
#include "platform/str.h"

namespace tvx::toolsversion {

namespace {

const xmlChar *X(const char *s) { return reinterpret_cast<const xmlChar *>(s); }

bool IsEmpty(const char *text) { return text == nullptr || text[0] == '\0'; }

void RemoveNode(xmlNode *node) {
  if (node == nullptr) return;
  tvx::Xml().xmlUnlinkNode(node);
  tvx::Xml().xmlFreeNode(node);
}

xmlNode *Append(xmlNode *parent, const xmlChar *name) {
  return tvx::Xml().xmlNewChild(parent, nullptr, name, nullptr);
}

// A text the document can carry and give back: valid UTF-8 without the
// control characters XML 1.0 cannot represent. A guest's manifest is not
// trusted to hold only such text, and one bad byte written out would make
// the whole file unreadable.
bool IsXmlText(const std::string &text) {
  if (tvx::Xml().xmlCheckUTF8(X(text.c_str())) == 0) return false;
  for (char c : text) {
    if (ascii::IsControl(c) && c != '\t' && c != '\n' && c != '\r') return false;
  }
  return true;
}

// ApplyAgentReport replaces update-agent-info with the agent's report and
// the saved manifest with the monolithic version the agent saw.
bool ApplyAgentReport(xmlNode *root, const char *agentXml, xmlNode **agentInfo,
                      xmlNode **manifest) {
  UniquePtr<xmlDoc> agent = ParseXml(agentXml, std::strlen(agentXml));
  if (agent == nullptr) {
    TV_LOG("Error parsing xml from update agent.\n");
    return false;
  }
  RemoveNode(*agentInfo);
  *agentInfo = Append(root, X("update-agent-info"));
  xmlNode *agentRoot = tvx::Xml().xmlDocGetRootElement(agent.get());
  if (agentRoot == nullptr) {
    TV_LOG("Failed to find root in update agent xml.\n");
    return false;
  }
  std::optional<std::string> monoVersion;
  for (xmlNode *g = agentRoot->children; g != nullptr; g = g->next) {
    if (g->type != XML_ELEMENT_NODE) continue;
    xmlNode *group = Append(*agentInfo, g->name);
    for (xmlNode *c = g->children; c != nullptr; c = c->next) {
      if (c->type != XML_ELEMENT_NODE) continue;
      xmlNode *component = Append(group, c->name);
      for (const char *attr : {"guestVersion", "repoVersion", "status"}) {
        if (auto value = Attribute(c, attr)) tvx::Xml().xmlSetProp(component, X(attr), X(value->c_str()));
      }
      if (NameIs(g, "tools") && NameIs(c, "monolithic")) {
        if (auto v = Attribute(c, "guestVersion")) monoVersion = v;
      }
    }
  }
  RemoveNode(*manifest);
  *manifest = nullptr;
  if (monoVersion) {
    *manifest = Append(root, X("tools-manifest"));
    xmlNode *mono = Append(*manifest, X("monolithic"));
    tvx::Xml().xmlSetProp(mono, X("version"), X(monoVersion->c_str()));
  }
  return true;
}

struct ManifestWalk {
  xmlNode *manifest;
};

xmlNode *FindOrAppendExact(xmlNode *parent, const std::string &name) {
  for (xmlNode *n = parent->children; n != nullptr; n = n->next) {
    if (n->type == XML_ELEMENT_NODE && name == reinterpret_cast<const char *>(n->name)) return n;
  }
  return Append(parent, X(name.c_str()));
}

Bool AddManifestEntry(const char *name, const char *value, void *ctx) {
  auto *walk = static_cast<ManifestWalk *>(ctx);
  const char *dot = std::strrchr(name, '.');
  std::string component = dot != nullptr ? std::string(name, dot) : std::string(name);
  std::string suffix = dot != nullptr ? std::string(dot + 1) : std::string();
  if (dot != nullptr && ascii::Equal(suffix, "encoding")) return TRUE;
  if (!IsXmlText(component) || tvx::Xml().xmlValidateName(X(component.c_str()), 0) != 0 ||
      !IsXmlText(value)) {
    TV_LOG("Skipping manifest entry '%s': not representable in XML.\n", name);
    return TRUE;
  }
  xmlNode *node = FindOrAppendExact(walk->manifest, component);
  if (dot == nullptr) return TRUE;
  for (const char *attr : {"version", "installed"}) {
    if (ascii::Equal(suffix, attr)) tvx::Xml().xmlSetProp(node, X(attr), X(value));
  }
  return TRUE;
}

bool ApplyManifest(xmlNode *root, const char *manifestText, xmlNode **manifest) {
  DictPtr dict(Dictionary_Create());
  if (!Dictionary_LoadFromBuffer(dict.get(), manifestText, std::strlen(manifestText))) {
    CharPtr messages(Msg_GetMessagesAndReset());
    TV_LOG("Error loading dictionary from manifest buffer: %s.\n", messages.get());
    return false;
  }
  RemoveNode(*manifest);
  *manifest = Append(root, X("tools-manifest"));
  ManifestWalk walk{*manifest};
  if (Dictionary_Iterate(dict.get(), AddManifestEntry, &walk) !=
      Dictionary_NumberOfEntries(dict.get())) {
    TV_LOG("Error iterating through iso version info dictionary.\n");
    return false;
  }
  return true;
}

void SetNumber(xmlNode *parent, const char *name, int32_t value) {
  xmlNode *node = LastChildNamed(parent, name);
  if (node == nullptr) node = Append(parent, X(name));
  char text[16];
  Str_Snprintf(text, sizeof text, "%d", value);
  tvx::Xml().xmlNodeSetContent(node, X(text));
}

bool WriteDocument(xmlDoc *doc, const std::string &path) {
  xmlChar *raw = nullptr;
  int size = 0;
  tvx::Xml().xmlDocDumpMemory(doc, &raw, &size);
  XmlChars out(raw);
  if (out == nullptr || size <= 0) {
    TV_LOG("Error dumping xml doc to the output buffer.\n");
    return false;
  }
  // The file is the machine's own; a link to it (a machine folder that links
  // its files from elsewhere) is followed and kept.
  FileReplaceOptions options;
  options.links = FileLinkPolicy::kFollowLink;
  options.mustExist = true;
  bool filled = false;
  int writeErrno = 0, err = 0;
  Bool ok = File_ReplaceWith(
      path.c_str(), options,
      [&](int fd, const char *) {
        filled = true;
        if (WriteAll(fd, out.get(), static_cast<size_t>(size))) return true;
        writeErrno = errno;
        return false;
      },
      &err);
  if (!ok) {
    if (filled) {
      TV_LOG("Error writing to extended config file: errcode %d.\n",
             writeErrno != 0 ? writeErrno : err);
    } else {
      TV_LOG("Error opening extended config file for writing: errcode %d.\n", err);
    }
    TV_LOG("Failed to save xml buffer in extended config file.\n");
    return false;
  }
  return true;
}

}  // namespace

bool SaveXmlInfo(const char *configPath, const char *updateAgentXml, const char *manifestText,
                 int32_t installError, int32_t updateCounter) {
  if (IsEmpty(updateAgentXml) && IsEmpty(manifestText) && updateCounter == 0) return true;

  UniquePtr<MsgList> messages;
  DictPtr config =
      configPath != nullptr ? LoadDictionary(configPath, nullptr, 0, &messages) : nullptr;
  if (config == nullptr) {
    TV_LOG("Error loading dictionary for tvxx config file.");
    MsgList_Log(messages.get());
    TV_LOG("Error getting extended config file path.\n");
    return false;
  }
  std::string path = ExtendedConfigPath(configPath, config.get());
  if (path.empty()) {
    TV_LOG("Error getting extended config file path.\n");
    return false;
  }
  xmlNode *root = nullptr;
  UniquePtr<xmlDoc> doc = LoadExtendedConfig(path, &root);
  if (doc == nullptr) return false;

  xmlNode *manifest = LastChildNamed(root, "tools-manifest");
  xmlNode *installInfo = LastChildNamed(root, "tools-install-info");
  xmlNode *agentInfo = LastChildNamed(root, "update-agent-info");

  if (!IsEmpty(updateAgentXml) && std::strcmp(updateAgentXml, "null") != 0) {
    if (std::strcmp(updateAgentXml, "no tools") == 0) {
      while (xmlNode *tools =
                 agentInfo != nullptr ? FirstChildNamed(agentInfo, "tools") : nullptr) {
        RemoveNode(tools);
      }
      RemoveNode(manifest);
      manifest = nullptr;
    } else if (!ApplyAgentReport(root, updateAgentXml, &agentInfo, &manifest)) {
      return false;
    }
  }
  if (!IsEmpty(manifestText) && std::strcmp(manifestText, "null") != 0) {
    if (std::strcmp(manifestText, "no tools") == 0) {
      RemoveNode(manifest);
      manifest = nullptr;
    } else if (!ApplyManifest(root, manifestText, &manifest)) {
      return false;
    }
  }
  if (updateCounter != 0) {
    if (installInfo == nullptr) installInfo = Append(root, X("tools-install-info"));
    SetNumber(installInfo, "installError", installError);
    SetNumber(installInfo, "updateCounter", updateCounter);
  }
  return WriteDocument(doc.get(), path);
}

}  // namespace tvx::toolsversion
