// The exported calls of the guest-tools status: they translate, and keep
// every C++ exception inside the library.
#include <cstdlib>
#include <cstring>

#include "lib/toolsversion/toolsversion_internal.h"

namespace {

using tvx::toolsversion::ComponentRow;

char *Copy(const std::string &s) {
  char *out = static_cast<char *>(std::malloc(s.size() + 1));
  if (out != nullptr) std::memcpy(out, s.c_str(), s.size() + 1);
  return out;
}

void FillComponent(ToolsVersionComponent *out, const ComponentRow &row) {
  out->name = Copy(row.name);
  out->rating = row.rating;
  out->installed = row.installed ? TRUE : FALSE;
  out->guestVersion = Copy(row.guest);
  out->hostVersion = Copy(row.host);
  out->avrMin = Copy(row.min);
  out->avrMax = Copy(row.max);
  out->avrIllegal = Copy(row.illegal);
}

void FreeComponent(ToolsVersionComponent *c) {
  for (char *text :
       {c->name, c->guestVersion, c->hostVersion, c->avrMin, c->avrMax, c->avrIllegal}) {
    std::free(text);
  }
}

ToolsVersionReport *MakeReport(const tvx::toolsversion::Report &r, uint32_t status) {
  auto *out = static_cast<ToolsVersionReport *>(std::calloc(1, sizeof(ToolsVersionReport)));
  if (out == nullptr) return nullptr;
  out->status = status;
  out->evaluated = r.evaluated ? TRUE : FALSE;
  out->manifestStatus = r.manifestStatus;
  out->savedStatus = r.savedStatus ? TRUE : FALSE;
  out->toolsVersion = r.toolsVersion;
  out->minVersion = r.minVersion;
  out->maxVersion = r.maxVersion;
  out->reason = r.reason.empty() ? nullptr : Copy(r.reason);
  if (r.evaluated) FillComponent(&out->monolithic, r.monolithic);
  if (!r.components.empty()) {
    out->components = static_cast<ToolsVersionComponent *>(
        std::calloc(r.components.size(), sizeof(ToolsVersionComponent)));
    if (out->components != nullptr) {
      out->numComponents = r.components.size();
      for (size_t i = 0; i < r.components.size(); i++) {
        FillComponent(&out->components[i], r.components[i]);
      }
    }
  }
  return out;
}

}  // namespace

extern "C" {

TVX_EXPORT uint32_t ToolsVersion_GetStatusReport(const char *configPath, Dictionary *config,
                                                 const char *guestManifestPath,
                                                 const char *guestManifestText,
                                                 uint32_t toolsVersion, int32_t mode,
                                                 const char *certFile,
                                                 ToolsVersionReport **out_report) {
  if (out_report != nullptr) *out_report = nullptr;
  try {
    tvx::toolsversion::Report report;
    report.certFile = certFile;
    // A missing configuration reads as an empty one: no guest OS, no files.
    tvx::toolsversion::DictPtr empty(config == nullptr ? Dictionary_Create() : nullptr);
    if (config == nullptr) config = empty.get();
    uint32_t status = tvx::toolsversion::GetStatus(configPath, config, guestManifestPath,
                                                   guestManifestText, toolsVersion, mode, &report);
    if (out_report != nullptr) *out_report = MakeReport(report, status);
    return status;
  } catch (...) {
    return TOOLS_STATUS_UNKNOWN;
  }
}

TVX_EXPORT uint32_t ToolsVersion_GetStatus(const char *configPath, Dictionary *config,
                                           const char *guestManifestPath,
                                           const char *guestManifestText, uint32_t toolsVersion,
                                           int32_t mode) {
  return ToolsVersion_GetStatusReport(configPath, config, guestManifestPath, guestManifestText,
                                      toolsVersion, mode, nullptr, nullptr);
}

TVX_EXPORT void ToolsVersion_FreeReport(ToolsVersionReport *report) {
  if (report == nullptr) return;
  if (report->evaluated) FreeComponent(&report->monolithic);
  for (size_t i = 0; i < report->numComponents; i++) FreeComponent(&report->components[i]);
  std::free(report->components);
  std::free(report->reason);
  std::free(report);
}

TVX_EXPORT Bool ToolsVersion_SaveXmlInfo(const char *configPath, const char *updateAgentXml,
                                         const char *manifestText, int32_t installError,
                                         int32_t updateCounter) {
  try {
    return tvx::toolsversion::SaveXmlInfo(configPath, updateAgentXml, manifestText, installError,
                                          updateCounter)
               ? TRUE
               : FALSE;
  } catch (...) {
    return FALSE;
  }
}

TVX_EXPORT const char *ToolsVersion_ComponentStatusText(uint32_t rating) {
  return tvx::toolsversion::ComponentStatusText(rating);
}

TVX_EXPORT const char *ToolsVersion_StatusName(uint32_t status) {
  static const char *const kNames[] = {"TOOLS_STATUS_INVALID",        "TOOLS_STATUS_TOO_OLD",
                                       "TOOLS_STATUS_SUPPORTED_OLD",  "TOOLS_STATUS_CURRENT",
                                       "TOOLS_STATUS_SUPPORTED_NEW",  "TOOLS_STATUS_TOO_NEW",
                                       "TOOLS_STATUS_BLACKLISTED",    "TOOLS_STATUS_NOT_INSTALLED",
                                       "TOOLS_STATUS_NOT_APPLICABLE", "TOOLS_STATUS_UNKNOWN"};
  return status < sizeof kNames / sizeof kNames[0] ? kNames[status] : kNames[0];
}

}  // extern "C"
