/*
 * tvx_toolsversion.h -- how the guest tools of a virtual machine stand
 * against the host's tools image, and the guest-tools information kept in
 * the machine's extended config file.
 *
 * 1. Manifests are dictionaries (tvx_dictionary.h) whose entries are
 *    "<component>.version" (a version text), "<component>.installed" (guest
 *    only), "<component>.version_max" and "<component>.version_illegal" (the
 *    signed AVR manifest only), and "components.log" / "result.log" (host and
 *    AVR: switch on the component table and the rating lists in the log).
 * 2. A version text is dotted decimal numbers (at most four count, more are
 *    read and dropped), optionally followed by "#" and how many leading
 *    numbers take part in comparisons (1 to 4; 3 when absent; 0 makes the
 *    version "not set"). "11.2.5" is 11.2.5.0 compared over three numbers.
 * 3. The host manifest is "manifest.txt" inside the tools image that the
 *    tools directory ("libdir" of the configuration) offers for the guest,
 *    read through the block-verified reader, so a tampered or unsigned image
 *    gives no host manifest (status TOOLS_STATUS_UNKNOWN before the legacy
 *    number refines it). The AVR manifest lies beside the image as
 *    "<image base name>_avr_manifest.txt" with a detached signature ".sig";
 *    one that is missing or fails its check is ignored and the host versions
 *    become the minimums.
 * 4. Nothing here keeps state between calls, apart from the once-only
 *    libxml2 version check; calls may run on any thread, but two saves for
 *    the same machine are not coordinated with each other.
 * Conventions: tvx_base.h. Detail goes to the log; every line of this
 * subsystem starts with "ToolsVersion: ".
 *
 * Decisions on the points the rules leave open
 *  1. An illegal-version list may hold blanks after a "," as well as before
 *     it: "10.0.0#3 , 9.4" is two versions. Blanks are skipped after each
 *     version and after each ",".
 *  2. A save rewrites the extended config file as a whole and crash-safely:
 *     a temporary file in the same directory, flushed to disk, given the old
 *     file's permission bits and renamed over it. A save that fails at any
 *     point leaves the old file as it was and no temporary file behind. The
 *     rewrite goes through a symbolic link to the file the link names (the
 *     file is the machine's own, and a machine folder may link it from a
 *     shared place); a hard-linked file gets a new inode, its other names
 *     keep the old contents.
 *  3. Attribute names written into the saved manifest are the lower-case
 *     "version" and "installed", whatever case the manifest entry's suffix
 *     had ("x.VERSION" gives version="..."), since the reader looks for
 *     exactly those names.
 *  4. An absolute "extendedConfigFile" value is taken as it stands; a
 *     relative one is taken from the folder of the configuration file.
 *  5. Every message carries the "ToolsVersion: " prefix, also those whose
 *     quoted form lacks it, so that a host can route this subsystem's lines;
 *     the tools-image and dictionary layers below log under their own names.
 *  6. With the legacy number 4294967295 (look it up on the disks) and a
 *     configuration that names no virtual disk, the guest has no disk that
 *     could carry tools: TOOLS_STATUS_NOT_INSTALLED when the manifests gave
 *     no status, else that status (the unknown legacy number never lowers a
 *     status the manifests gave).
 *  7. Parsing XML never reaches the network nor prints to stderr: libxml2
 *     reads with network access off and its error output silenced.
 *  8. A saved manifest entry whose component name is not an XML name, or
 *     whose value is not text XML can carry (invalid UTF-8, control
 *     characters), is skipped with a log line: written out, it would make
 *     the whole file unreadable and lose every later report.
 *  9. The extraction of the host manifest goes to the caller's guest
 *     manifest path with ".iso.shipped" appended, else to the user's private
 *     temporary directory under a per-thread name; it is removed on every
 *     path.
 */
#ifndef TVX_TOOLSVERSION_H
#define TVX_TOOLSVERSION_H

#include "tvx_base.h"
#include "tvx_dictionary.h"

TVX_BEGIN_DECLS

/* ToolsVersionNumber: a version value (see 2. above). precision 0 = not set. */
typedef struct ToolsVersionNumber {
  uint32_t precision;
  uint32_t numbers[4];
} ToolsVersionNumber;

/* The rating of one component, in the order of its display texts. */
typedef enum ToolsComponentStatus {
  TOOLS_COMPONENT_BLACKLISTED = 0,   /* "blacklisted" */
  TOOLS_COMPONENT_TOO_OLD = 1,       /* "too old" */
  TOOLS_COMPONENT_TOO_NEW = 2,       /* "too new" */
  TOOLS_COMPONENT_SUPPORTED_OLD = 3, /* "supported old" */
  TOOLS_COMPONENT_SUPPORTED_NEW = 4, /* "supported new" */
  TOOLS_COMPONENT_CURRENT = 5,       /* "current" */
  TOOLS_COMPONENT_ADDITIONAL = 6,    /* "additional in the guest" */
  TOOLS_COMPONENT_MISSING = 7,       /* "missing from the guest" */
  TOOLS_COMPONENT_NOT_INSTALLED = 8, /* "not installed" */
  TOOLS_COMPONENT_GONE = 9,          /* "gone" */
} ToolsComponentStatus;

/* The status of the guest tools as a whole (0 is never returned). */
typedef enum ToolsVersionStatus {
  TOOLS_STATUS_TOO_OLD = 1,
  TOOLS_STATUS_SUPPORTED_OLD = 2,
  TOOLS_STATUS_CURRENT = 3,
  TOOLS_STATUS_SUPPORTED_NEW = 4,
  TOOLS_STATUS_TOO_NEW = 5,
  TOOLS_STATUS_BLACKLISTED = 6,
  TOOLS_STATUS_NOT_INSTALLED = 7,
  TOOLS_STATUS_NOT_APPLICABLE = 8,
  TOOLS_STATUS_UNKNOWN = 9,
} ToolsVersionStatus;

/* Legacy tools version number: major << 10 | minor << 5 | patch. */
#define TOOLS_VERSION_NONE 0u                /* no tools */
#define TOOLS_VERSION_NOT_APPLICABLE 0x7FFFFFFFu
#define TOOLS_VERSION_FROM_DISKS 0xFFFFFFFFu /* read it from the virtual disks */

/* ToolsVersion_GetStatus tells how the guest tools of the machine stand.
 *  configPath         the machine's configuration file (messages, the
 *                     extended config file, the virtual disks)
 *  config             its loaded configuration (NULL reads as empty):
 *                     "guestOS", "libdir" (default
 *                     "/usr/lib/tarvex"), "tools.hint.imageName",
 *                     "extendedConfigFile", the disk entries
 *  guestManifestPath  optional guest manifest file
 *  guestManifestText  optional guest manifest text, used without a path; ""
 *                     means the guest reported none; with neither, the
 *                     extended config file's saved status or manifest is used
 *  toolsVersion       the legacy number (see the TOOLS_VERSION_* values)
 *  mode               -1, 0, 1 plain; 2 also answers NOT_APPLICABLE for a
 *                     hypervisor guest; any other value: NOT_APPLICABLE.
 * Returns a ToolsVersionStatus, or a status saved in the extended config file
 * as it was read. Never fails otherwise: missing sources give UNKNOWN before
 * the legacy number is consulted. */
TVX_EXPORT uint32_t ToolsVersion_GetStatus(const char *configPath, Dictionary *config,
                                           const char *guestManifestPath,
                                           const char *guestManifestText, uint32_t toolsVersion,
                                           int32_t mode);

/* ToolsVersion_SaveXmlInfo merges what the guest reported into the machine's
 * existing extended config file (named by "extendedConfigFile" in the
 * configuration at `configPath`; the file is never created here).
 *  updateAgentXml  the update agent's XML report, "null" (keep), "no tools"
 *                  (forget the agent's tools group and the saved manifest),
 *                  or NULL/"" (nothing)
 *  manifestText    a guest manifest in dictionary text, "null", "no tools"
 *                  (forget the saved manifest), or NULL/""
 *  installError, updateCounter  saved when updateCounter is not 0
 * TRUE when saved, and when there was nothing to save (both texts empty and
 * updateCounter 0: the file is not touched). FALSE, with the file unchanged,
 * when the configuration, the file or a report cannot be read or parsed, or
 * the new file cannot be written (see decision 2). */
TVX_EXPORT Bool ToolsVersion_SaveXmlInfo(const char *configPath, const char *updateAgentXml,
                                         const char *manifestText, int32_t installError,
                                         int32_t updateCounter);

/* A report of one status computation, for people who want to see why. */
typedef struct ToolsVersionComponent {
  char *name;          /* the component ("monolithic" for the monolithic record) */
  uint32_t rating;     /* ToolsComponentStatus */
  Bool installed;
  char *guestVersion;  /* version texts; "" when not set */
  char *hostVersion;
  char *avrMin;
  char *avrMax;
  char *avrIllegal;    /* the illegal versions joined by ", " */
} ToolsVersionComponent;

typedef struct ToolsVersionReport {
  uint32_t status;          /* what ToolsVersion_GetStatus returns */
  Bool evaluated;           /* manifests were compared (the fields below are set) */
  uint32_t manifestStatus;  /* the status the manifests gave, or a saved one */
  Bool savedStatus;         /* manifestStatus was read from the extended config file */
  ToolsVersionComponent monolithic;
  size_t numComponents;
  ToolsVersionComponent *components; /* the table order */
  char *reason;             /* why: the deciding line (no prefix, no line end), or NULL */
  uint32_t toolsVersion;    /* the legacy number used (after the disk lookup) */
  uint32_t minVersion;      /* the guest's legacy limits (0 when not reached) */
  uint32_t maxVersion;
} ToolsVersionReport;

/* ToolsVersion_GetStatusReport is ToolsVersion_GetStatus that also hands out
 * a report in *out_report (optional; free it with ToolsVersion_FreeReport).
 * `certFile` (optional; NULL: the installed maker certificates) names the
 * maker certificates that the tools image's hash data and the AVR manifest
 * must be signed under, as ToolsISO_GetImagePathEx takes it: for publishers
 * checking their own signing keys. A host passes NULL. */
TVX_EXPORT uint32_t ToolsVersion_GetStatusReport(const char *configPath, Dictionary *config,
                                                 const char *guestManifestPath,
                                                 const char *guestManifestText,
                                                 uint32_t toolsVersion, int32_t mode,
                                                 const char *certFile,
                                                 ToolsVersionReport **out_report);
/* ToolsVersion_FreeReport releases a report; NULL is harmless. */
TVX_EXPORT void ToolsVersion_FreeReport(ToolsVersionReport *report);

/* ToolsVersion_ComponentStatusText: "too old" ... (constant), "?" when out of
 * range. ToolsVersion_StatusName: "TOOLS_STATUS_CURRENT" ... (constant),
 * "TOOLS_STATUS_INVALID" for any other value. */
TVX_EXPORT const char *ToolsVersion_ComponentStatusText(uint32_t rating);
TVX_EXPORT const char *ToolsVersion_StatusName(uint32_t status);

TVX_END_DECLS

#endif /* TVX_TOOLSVERSION_H */
