// Reading answer files back in tests: XPath queries over a saved unattend
// file and the independent well-formedness check of xmllint.
#pragma once

#include <libxml/parser.h>
#include <libxml/xpath.h>
#include <libxml/xpathInternals.h>

#include <string>
#include <vector>

#include "support/run_argv.h"

namespace tvxtest {

class UnattendXml {
 public:
  explicit UnattendXml(const std::string &path)
      : doc_(xmlReadFile(path.c_str(), nullptr, XML_PARSE_NONET)) {
    if (doc_ != nullptr) {
      ctx_ = xmlXPathNewContext(doc_);
      xmlXPathRegisterNs(ctx_, BAD_CAST "urn", BAD_CAST "urn:schemas-microsoft-com:unattend");
      xmlXPathRegisterNs(ctx_, BAD_CAST "wcm",
                         BAD_CAST "http://schemas.microsoft.com/WMIConfig/2002/State");
    }
  }
  ~UnattendXml() {
    if (ctx_ != nullptr) xmlXPathFreeContext(ctx_);
    if (doc_ != nullptr) xmlFreeDoc(doc_);
  }
  UnattendXml(const UnattendXml &) = delete;
  UnattendXml &operator=(const UnattendXml &) = delete;

  bool ok() const { return doc_ != nullptr; }

  // Texts returns the string value of every node `expr` selects.
  std::vector<std::string> Texts(const std::string &expr) const {
    std::vector<std::string> out;
    if (ctx_ == nullptr) return out;
    xmlXPathObject *obj = xmlXPathEvalExpression(BAD_CAST expr.c_str(), ctx_);
    if (obj != nullptr && obj->nodesetval != nullptr) {
      for (int i = 0; i < obj->nodesetval->nodeNr; ++i) {
        xmlChar *s = xmlNodeGetContent(obj->nodesetval->nodeTab[i]);
        out.emplace_back(s != nullptr ? reinterpret_cast<char *>(s) : "");
        xmlFree(s);
      }
    }
    xmlXPathFreeObject(obj);
    return out;
  }
  size_t Count(const std::string &expr) const { return Texts(expr).size(); }
  // Text is the value of the only node `expr` selects, or "<n nodes>".
  std::string Text(const std::string &expr) const {
    std::vector<std::string> all = Texts(expr);
    return all.size() == 1 ? all[0] : "<" + std::to_string(all.size()) + " nodes>";
  }

 private:
  xmlDoc *doc_ = nullptr;
  xmlXPathContext *ctx_ = nullptr;
};

// XmllintAccepts runs the independent checker on a file.
inline bool XmllintAccepts(const std::string &path) {
  return RunArgv({"xmllint", "--noout", path}) == 0;
}

// Paths of the unattend elements that tests look at.
#define TVXTEST_OOBE "//urn:settings[@pass='oobeSystem']/urn:component[@name='Microsoft-Windows-Shell-Setup']"
#define TVXTEST_PE_SETUP "//urn:settings[@pass='windowsPE']/urn:component[@name='Microsoft-Windows-Setup']"
#define TVXTEST_PE_INTL \
  "//urn:settings[@pass='windowsPE']/urn:component[@name='Microsoft-Windows-International-Core-WinPE']"
#define TVXTEST_FIRST_LOGON TVXTEST_OOBE "/urn:FirstLogonCommands/urn:SynchronousCommand"

}  // namespace tvxtest
