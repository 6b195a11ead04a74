// libxml2, opened on first use (see dynlib.h): linking it would load ICU into
// every process, ten of the twelve milliseconds a `detect` takes. libxml2's
// headers give the types and macros; its functions are called through the
// table below, by their own names: Xml().xmlReadMemory(...).
#pragma once

#include <libxml/entities.h>
#include <libxml/parser.h>
#include <libxml/tree.h>
#include <libxml/xmlstring.h>
#include <libxml/xpath.h>
#include <libxml/xpathInternals.h>

namespace tvx {

#define TVX_XML_FUNCTIONS(X)                                                                 \
  X(xmlAddChild) X(xmlAddPrevSibling) X(xmlCheckUTF8) X(xmlDocDumpMemory)                    \
  X(xmlDocGetRootElement) X(xmlEncodeEntitiesReentrant) X(xmlFreeDoc) X(xmlFreeNode)         \
  X(xmlGetProp) X(xmlIsBlankNode) X(xmlNewChild) X(xmlNewNode) X(xmlNewNs) X(xmlNewNsProp)   \
  X(xmlNewText) X(xmlNewTextChild) X(xmlNodeGetContent) X(xmlNodeSetContent) X(xmlReadFile)  \
  X(xmlReadMemory) X(xmlSearchNsByHref) X(xmlSetProp) X(xmlStrEqual) X(xmlUnlinkNode)        \
  X(xmlValidateName) X(xmlXPathEvalExpression) X(xmlXPathFreeContext) X(xmlXPathFreeObject) \
  X(xmlXPathNewContext) X(xmlXPathRegisterNs)

struct XmlApi {
#define TVX_XML_ENTRY(name) decltype(&::name) name;
  TVX_XML_FUNCTIONS(TVX_XML_ENTRY)
#undef TVX_XML_ENTRY
  // libxml2's deallocator is a variable holding a function pointer; this is
  // its address: (*Xml().xmlFree)(p).
  decltype(&::xmlFree) xmlFree;
};

// LoadXml opens libxml2 (once; later calls are cheap), checks its version and
// initialises the parser. Null when it cannot be loaded: work on XML starts
// with this call and fails as on an unreadable document.
const XmlApi *LoadXml();

// Xml is the loaded table, for code that holds a document or node: one
// exists only once LoadXml has succeeded.
inline const XmlApi &Xml() { return *LoadXml(); }

}  // namespace tvx
