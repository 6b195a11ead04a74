// Owners for libxml2 objects (see unique.h for the pattern).
#pragma once

#include <libxml/tree.h>
#include <libxml/xpath.h>
#include <libxml/xmlwriter.h>

#include "platform/unique.h"

namespace tvx {

TVX_MAKE_DELETER(xmlDoc, xmlFreeDoc);
TVX_MAKE_DELETER(xmlXPathContext, xmlXPathFreeContext);
TVX_MAKE_DELETER(xmlXPathObject, xmlXPathFreeObject);
TVX_MAKE_DELETER(xmlBuffer, xmlBufferFree);
TVX_MAKE_DELETER(xmlTextWriter, xmlFreeTextWriter);

// XmlChars owns a string that libxml2 allocated (xmlFree).
struct XmlCharsDeleter {
  void operator()(xmlChar *p) const noexcept { xmlFree(p); }
};
using XmlChars = std::unique_ptr<xmlChar, XmlCharsDeleter>;

}  // namespace tvx
