#include "platform/xml.h"

#include <libxml/xmlversion.h>

#include "platform/dynlib.h"

namespace tvx {

const XmlApi *LoadXml() {
  return LoadOnce<XmlApi>([](XmlApi *api) {
    DynLib lib("libxml2.so.2");
    decltype(&::xmlCheckVersion) checkVersion;
    decltype(&::xmlInitParser) initParser;
    bool ok = lib.Resolve("xmlCheckVersion", &checkVersion) &&
              lib.Resolve("xmlInitParser", &initParser) && lib.Resolve("xmlFree", &api->xmlFree);
#define TVX_XML_RESOLVE(name) ok = ok && lib.Resolve(#name, &api->name);
    TVX_XML_FUNCTIONS(TVX_XML_RESOLVE)
#undef TVX_XML_RESOLVE
    if (!ok) return false;
    // Says so on standard error when the library found is older than the
    // headers this was built with (the soname already fixes the major).
    checkVersion(LIBXML_VERSION);
    initParser();
    return true;
  });
}

}  // namespace tvx
