// Owners for libxml2 objects (see unique.h for the pattern). They release
// through the loaded library: an object exists only once LoadXml succeeded.
#pragma once

#include "platform/unique.h"
#include "platform/xml.h"

namespace tvx {

TVX_MAKE_DELETER(xmlDoc, Xml().xmlFreeDoc);
TVX_MAKE_DELETER(xmlXPathContext, Xml().xmlXPathFreeContext);
TVX_MAKE_DELETER(xmlXPathObject, Xml().xmlXPathFreeObject);

// XmlChars owns a string that libxml2 allocated (xmlFree).
struct XmlCharsDeleter {
  void operator()(xmlChar *p) const noexcept { (*Xml().xmlFree)(p); }
};
using XmlChars = std::unique_ptr<xmlChar, XmlCharsDeleter>;

}  // namespace tvx
