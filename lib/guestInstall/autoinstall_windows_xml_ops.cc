// The four XPath-driven edits of an unattend document. Each evaluates one
// expression in a context that binds "urn" to the unattend namespace and
// changes the nodes it finds; an expression that finds nothing changes
// nothing.
#include <libxml/entities.h>
#include <libxml/xpathInternals.h>

#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <vector>

#include "lib/guestInstall/autoinstall_windows_xml.h"
#include "platform/xml_unique.h"
#include "platform/str.h"

namespace tvx::autoinstall {
namespace {

constexpr char kFirstLogonOrders[] =
    "//urn:settings[@pass='oobeSystem']/urn:component[@name='Microsoft-Windows-Shell-Setup']"
    "/urn:FirstLogonCommands/urn:SynchronousCommand/urn:Order";
constexpr char kWcmNamespace[] = "http://schemas.microsoft.com/WMIConfig/2002/State";

const xmlChar *X(const char *s) { return reinterpret_cast<const xmlChar *>(s); }

// Eval returns the node-set result of `expr`, or null when the expression
// yields no node or is not a node set.
tvx::UniquePtr<xmlXPathObject> Eval(xmlXPathContext *ctx, const char *expr) {
  if (ctx == nullptr || expr == nullptr) return nullptr;
  tvx::UniquePtr<xmlXPathObject> obj(tvx::Xml().xmlXPathEvalExpression(X(expr), ctx));
  if (obj == nullptr || obj->type != XPATH_NODESET || xmlXPathNodeSetIsEmpty(obj->nodesetval)) {
    return nullptr;
  }
  return obj;
}

// DecodeUtf8 reads one strictly formed UTF-8 character (no overlong forms,
// no surrogates, nothing above U+10FFFF); -1 when malformed.
int32_t DecodeUtf8(const unsigned char *&p) {
  unsigned char b = *p++;
  if (b < 0x80) return b;
  int extra = (b & 0xE0) == 0xC0 ? 1 : (b & 0xF0) == 0xE0 ? 2 : (b & 0xF8) == 0xF0 ? 3 : 0;
  if (extra == 0) return -1;
  static constexpr int32_t kMin[] = {0, 0x80, 0x800, 0x10000};
  int32_t cp = b & (0x3F >> extra);
  for (int i = 0; i < extra; ++i) {
    if ((*p & 0xC0) != 0x80) return -1;  // also stops at the terminating NUL
    cp = (cp << 6) | (*p++ & 0x3F);
  }
  if (cp < kMin[extra] || cp > 0x10FFFF || (cp >= 0xD800 && cp <= 0xDFFF)) return -1;
  return cp;
}

bool IsXmlChar(int32_t c) {
  return c == 0x9 || c == 0xA || c == 0xD || (c >= 0x20 && c <= 0xD7FF) ||
         (c >= 0xE000 && c <= 0xFFFD) || (c >= 0x10000 && c <= 0x10FFFF);
}

bool IsBlankText(const xmlNode *node) {
  return node != nullptr && node->type == XML_TEXT_NODE && tvx::Xml().xmlIsBlankNode(const_cast<xmlNode *>(node));
}

// StillInDocument tells whether `node` still hangs below the document node,
// i.e. no ancestor of it has been unlinked.
bool StillInDocument(const xmlNode *node) {
  for (; node != nullptr; node = node->parent) {
    if (node->type == XML_DOCUMENT_NODE || node->type == XML_HTML_DOCUMENT_NODE) return true;
  }
  return false;
}

// Append adds `child` as the last element of `parent`. When the template is
// indented, the new element gets the indentation of its elder sibling and the
// closing tag keeps its own, so the saved file still reads well.
void Append(xmlNode *parent, xmlNode *elder, xmlNode *child) {
  xmlNode *closing = parent->last;
  xmlNode *indent = elder->prev;
  if (IsBlankText(closing) && closing != indent && IsBlankText(indent)) {
    // Adding the indentation next to the closing text would merge the two.
    tvx::Xml().xmlAddPrevSibling(closing, child);
    xmlNode *copy = tvx::Xml().xmlNewText(indent->content);
    if (copy != nullptr) tvx::Xml().xmlAddPrevSibling(child, copy);
    return;
  }
  tvx::Xml().xmlAddChild(parent, child);
}

}  // namespace

xmlXPathContext *AutoInstallXmlNewContext(xmlDoc *doc) {
  if (doc == nullptr) return nullptr;
  xmlXPathContext *ctx = tvx::Xml().xmlXPathNewContext(doc);
  if (ctx == nullptr) return nullptr;
  if (tvx::Xml().xmlXPathRegisterNs(ctx, X("urn"), X(AUTOINSTALL_UNATTEND_NS)) != 0) {
    tvx::Xml().xmlXPathFreeContext(ctx);
    return nullptr;
  }
  return ctx;
}

Bool AutoInstallXmlTextIsValid(const char *text) {
  if (text == nullptr) return TRUE;
  const unsigned char *p = reinterpret_cast<const unsigned char *>(text);
  while (*p != '\0') {
    int32_t c = DecodeUtf8(p);
    if (c < 0 || !IsXmlChar(c)) return FALSE;
  }
  return TRUE;
}

Bool AutoInstallXmlSetText(xmlXPathContext *ctx, const char *expr, const char *text) {
  // libxml2 would turn a control character into a character reference that
  // no XML parser accepts, so such a text is refused before anything changes.
  if (text == nullptr || !AutoInstallXmlTextIsValid(text)) return FALSE;
  tvx::UniquePtr<xmlXPathObject> obj = Eval(ctx, expr);
  if (obj == nullptr) return FALSE;
  // xmlNodeSetContent reads entity and character references in its argument,
  // so the text is escaped first to arrive verbatim.
  tvx::XmlChars escaped(tvx::Xml().xmlEncodeEntitiesReentrant(nullptr, X(text)));
  if (escaped == nullptr) return FALSE;
  tvx::Xml().xmlNodeSetContent(obj->nodesetval->nodeTab[0], escaped.get());
  return TRUE;
}

Bool AutoInstallXmlRemoveNodes(xmlXPathContext *ctx, const char *expr) {
  tvx::UniquePtr<xmlXPathObject> obj = Eval(ctx, expr);
  if (obj == nullptr) return FALSE;
  xmlNodeSet *set = obj->nodesetval;
  // A node nested inside another selected node goes with its ancestor: it is
  // neither unlinked on its own nor freed twice.
  std::vector<xmlNode *> removed;
  for (int i = 0; i < set->nodeNr; ++i) {
    xmlNode *node = set->nodeTab[i];
    if (node->type == XML_NAMESPACE_DECL || !StillInDocument(node)) continue;
    tvx::Xml().xmlUnlinkNode(node);
    removed.push_back(node);
  }
  for (xmlNode *node : removed) tvx::Xml().xmlFreeNode(node);
  return TRUE;
}

Bool AutoInstallXmlSetAmd64(xmlXPathContext *ctx, const char *expr) {
  tvx::UniquePtr<xmlXPathObject> obj = Eval(ctx, expr);
  if (obj == nullptr) return FALSE;
  xmlNode *node = obj->nodesetval->nodeTab[0];
  if (node->type != XML_ELEMENT_NODE) return FALSE;
  return tvx::Xml().xmlSetProp(node, X("processorArchitecture"), X("amd64")) != nullptr;
}

Bool AutoInstallXmlAddFirstLogonCommand(xmlDoc *doc, const char *commandLine) {
  if (commandLine == nullptr || !AutoInstallXmlTextIsValid(commandLine)) return FALSE;
  tvx::UniquePtr<xmlXPathContext> ctx(AutoInstallXmlNewContext(doc));
  if (ctx == nullptr) return FALSE;
  tvx::UniquePtr<xmlXPathObject> obj = Eval(ctx.get(), kFirstLogonOrders);
  if (obj == nullptr) return FALSE;

  xmlNode *lastOrder = obj->nodesetval->nodeTab[obj->nodesetval->nodeNr - 1];
  xmlNode *command = lastOrder->parent;
  xmlNode *commands = command != nullptr ? command->parent : nullptr;
  if (command == nullptr || commands == nullptr || commands->type != XML_ELEMENT_NODE) {
    return FALSE;
  }

  tvx::XmlChars text(tvx::Xml().xmlNodeGetContent(lastOrder));
  const char *digits = text != nullptr ? reinterpret_cast<const char *>(text.get()) : "";
  errno = 0;
  long last = std::strtol(digits, nullptr, 10);
  // Orders run upwards from 1; a number past three digits does not fit the
  // order field, and writing a cut or wrapped number would run the commands
  // in the wrong order, so the command is not added at all.
  if (errno == ERANGE || last < 0 || last >= 999) return FALSE;
  char order[4];
  if (Str_Snprintf(order, sizeof order, "%d", static_cast<int>(last + 1)) < 0) return FALSE;

  xmlNs *ns = commands->ns;
  xmlNode *node = tvx::Xml().xmlNewNode(ns, X("SynchronousCommand"));
  if (node == nullptr) return FALSE;
  xmlNs *wcm = tvx::Xml().xmlSearchNsByHref(doc, commands, X(kWcmNamespace));
  if (wcm == nullptr || wcm->prefix == nullptr) wcm = tvx::Xml().xmlNewNs(node, X(kWcmNamespace), X("wcm"));
  if (wcm == nullptr || tvx::Xml().xmlNewNsProp(node, wcm, X("action"), X("add")) == nullptr ||
      tvx::Xml().xmlNewTextChild(node, ns, X("CommandLine"), X(commandLine)) == nullptr ||
      tvx::Xml().xmlNewTextChild(node, ns, X("Order"), X(order)) == nullptr) {
    tvx::Xml().xmlFreeNode(node);
    return FALSE;
  }
  Append(commands, command, node);
  return TRUE;
}

}  // namespace tvx::autoinstall
