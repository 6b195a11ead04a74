// Editing of the Windows unattend XML (Vista and newer) through libxml2 and
// XPath. Internal to the library; the driver is AutoInstall_PrepareAnswerFileEx.
#pragma once

#include <libxml/tree.h>
#include <libxml/xpath.h>

#include "platform/guestos.h"
#include "tvx_base.h"
#include "tvx_guess.h"

// The namespace of unattend files, bound to the prefix "urn" in every XPath
// context made here.
#define AUTOINSTALL_UNATTEND_NS "urn:schemas-microsoft-com:unattend"

namespace tvx::autoinstall {

// AutoInstallXmlNewContext returns an XPath context on `doc` with the "urn"
// prefix registered, or null.
xmlXPathContext *AutoInstallXmlNewContext(xmlDoc *doc);

// AutoInstallXmlTextIsValid tells whether `text` is UTF-8 made only of
// characters that XML 1.0 can carry (no control characters but tab, line feed
// and carriage return). Null is valid (nothing to write).
Bool AutoInstallXmlTextIsValid(const char *text);

// AutoInstallXmlSetText sets `text` as the content of the first node that
// `expr` selects. FALSE when nothing matches or the text cannot be carried
// (see AutoInstallXmlTextIsValid); the document is then unchanged.
Bool AutoInstallXmlSetText(xmlXPathContext *ctx, const char *expr, const char *text);

// AutoInstallXmlRemoveNodes unlinks and frees every node that `expr` selects,
// in document order. FALSE when nothing matches.
Bool AutoInstallXmlRemoveNodes(xmlXPathContext *ctx, const char *expr);

// AutoInstallXmlSetAmd64 sets processorArchitecture="amd64" on the first
// element that `expr` selects. FALSE when nothing matches.
Bool AutoInstallXmlSetAmd64(xmlXPathContext *ctx, const char *expr);

// AutoInstallXmlAddFirstLogonCommand appends a first-logon command running
// `commandLine`, numbered one above the document's last first-logon Order.
// FALSE, with the document unchanged, when the document has no first-logon
// command to follow, when the new number would need more than three digits or
// when the command line cannot be carried.
Bool AutoInstallXmlAddFirstLogonCommand(xmlDoc *doc, const char *commandLine);

// AutoInstallEditUnattendXml fills the user's answers into the unattend file
// at `xmlPath` and saves it in place. Optional texts (productKey, fullName,
// adminPassword, timeZoneName, language) may be null or empty. FALSE when the
// file does not parse, when a text cannot be carried by XML (the file is then
// left untouched) or when the file cannot be saved. Elements missing from the
// file are skipped.
Bool AutoInstallEditUnattendXml(const char *xmlPath, const char *productKey,
                                const char *fullName, const char *adminPassword,
                                const char *timeZoneName, GuestOSID osId, uint32_t version,
                                const char *language, const char *imageName, Bool autoLogon,
                                Bool keepPartitions);

}  // namespace tvx::autoinstall
