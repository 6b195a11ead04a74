// The host side of the comparison: "manifest.txt" from inside the tools
// image that serves the guest, read through the block-verified reader (a
// manifest from an image whose hash data or signature fails is never used),
// and the signed AVR manifest beside the image.
#include "lib/toolsversion/toolsversion_internal.h"
#include "platform/file.h"
#include "platform/str.h"
#include "platform/vthread.h"
#include "tvx_iso9660.h"
#include "tvx_toolsiso.h"
#include "tvx_toolsiso_image.h"

namespace tvx::toolsversion {

namespace {

constexpr const char kManifestName[] = "manifest.txt";
constexpr const char kDefaultLibDir[] = "/usr/lib/tarvex";

// ExtractionTarget names the file the host manifest is extracted to: beside
// the guest's manifest when there is one, else in the private temp dir under
// a per-thread name, so concurrent calls never share a file.
std::string ExtractionTarget(const char *guestManifestPath) {
  if (guestManifestPath != nullptr) {
    if (!File_Exists(guestManifestPath)) {
      TV_LOG("Error accessing guest tools version manifest file.\n");
      return "";
    }
    CharPtr target(Str_Asprintf(nullptr, "%s.%s", guestManifestPath, "iso.shipped"));
    return target.get();
  }
  CharPtr tmpDir(File_GetSafeTmpDir(TRUE));
  if (tmpDir == nullptr) {
    TV_LOG("Error retrieving local temp directory path.\n");
    return "";
  }
  CharPtr target(Str_Asprintf(nullptr, "%s%s%s.%lu.%s", tmpDir.get(), "/", kManifestName,
                              VThreadBase_GetKernelID(), "iso.shipped"));
  return target.get();
}

struct ToolsImage {
  CharPtr path;
  CharPtr baseName;
  uint32_t openMode = 0;
};

bool GetToolsIsoPath(const Dictionary *config, const char *certFile, ToolsImage *image) {
  constexpr const char *kFn = "GetToolsIsoPath";
  CharPtr libDir(Dict_GetString(config, kDefaultLibDir, "libdir"));
  CharPtr guestOS(Dict_GetString(config, nullptr, "guestOS"));
  CharPtr hint(Dict_GetString(config, nullptr, "tools.hint.imageName"));
  char *path = nullptr, *baseName = nullptr;
  if (libDir == nullptr) {
    TV_LOG("%s: Failed to get default libDir.\n", kFn);
  } else if (guestOS == nullptr) {
    TV_LOG("%s: Failed to find guestOS value.\n", kFn);
  } else if (!ToolsISO_GetImagePathEx(libDir.get(), guestOS.get(), hint.get(), TRUE, certFile,
                                      &path, &baseName, &image->openMode)) {
    TV_LOG("%s: Failed to get Tools ISO image path.\n", kFn);
  } else {
    image->path.reset(path);
    image->baseName.reset(baseName);
    return true;
  }
  TV_LOG("Failed to get tools iso path.\n");
  return false;
}

// ExtractHostManifest copies "manifest.txt" out of the verified image.
bool ExtractHostManifest(const char *realPath, uint32_t openMode, const char *certFile,
                         const std::string &target) {
  constexpr const char *kFn = "GetHostManifests";
  TV_LOG("%s: Extracting %s manifest file.\n", kFn, target.c_str());
  ToolsIsoLocalFile *handle = nullptr;
  int opened = ToolsISO_LocalFileOpenEx(realPath, TRUE, certFile, &handle);
  if (opened != 0) {
    if (opened == 2) TV_LOG("Failed to verify signature for Tools ISO image.\n");
    return false;
  }
  Iso9660Image *iso = nullptr;
  int rc = Iso9660_OpenWithReader(ToolsISO_LocalFileIsoReadCB, ToolsISO_LocalFileCloseCB, handle,
                                  openMode, &iso);
  if (rc != 0) {
    TV_LOG("Failed to open with reader now closing file Tools ISO %s (Iso9660Result=%d).\n",
           realPath, rc);
    ToolsISO_LocalFileCloseCB(handle);
    return false;
  }
  rc = Iso9660_ExtractFileEx(iso, kManifestName, target.c_str());
  Iso9660_Close(iso);
  if (rc != 0) {
    TV_LOG("Failed to extract %s file to %s from %s (Iso9660Result=%d).\n", kManifestName,
           target.c_str(), realPath, rc);
    return false;
  }
  TV_LOG("%s: Done extracting the manifest file.\n", kFn);
  return true;
}

}  // namespace

uint32_t GetHostManifests(const Dictionary *config, const char *guestManifestPath,
                          const Dictionary *guest, Report *report) {
  std::string target = ExtractionTarget(guestManifestPath);
  ToolsImage image;
  bool fetched = false;
  std::string avrPath;
  const char *certFile = report != nullptr ? report->certFile : nullptr;
  if (!target.empty() && GetToolsIsoPath(config, certFile, &image)) {
    CharPtr realPath(ToolsISO_GetRealPath(image.path.get()));
    if (realPath != nullptr) {
      char *dir = nullptr;
      File_GetPathName(realPath.get(), &dir, nullptr);
      CharPtr imageDir(dir);
      CharPtr avr(Str_Asprintf(nullptr, "%s%s%s_%s_%s", imageDir.get(), "/", image.baseName.get(),
                               "avr", kManifestName));
      avrPath = avr.get();
      fetched = ExtractHostManifest(realPath.get(), image.openMode, certFile, target);
    }
  }
  if (!fetched) {
    if (!target.empty()) File_UnlinkIfExists(target.c_str());
    TV_LOG("Error getting host tools manifest files.\n");
    return TOOLS_STATUS_UNKNOWN;
  }
  const char *avr = File_Exists(avrPath.c_str()) ? avrPath.c_str() : nullptr;
  uint32_t status = EvaluateManifests(target.c_str(), avr, guest, report);
  File_UnlinkIfExists(target.c_str());
  return status;
}

}  // namespace tvx::toolsversion
