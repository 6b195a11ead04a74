/*
 * tvx_autoinstall_windows.h -- the answer files of an unattended Windows
 * installation. Conventions: tvx_base.h.
 *
 * Preparation is single-threaded like every unattended-install call: one
 * answer file set at a time.
 */
#ifndef TVX_AUTOINSTALL_WINDOWS_H
#define TVX_AUTOINSTALL_WINDOWS_H

#include "tvx_base.h"
#include "tvx_guess.h"

TVX_BEGIN_DECLS

/* AutoInstall_PrepareAnswerFileEx writes the answer files of one Windows guest
 * into `outputDir` (which must exist): "winnt.sif" from `sifTemplatePath`
 * (setup of Windows 2000, XP and Server 2003), "autoun~0.xml" from
 * `xmlTemplatePath` (unattend XML of Vista and newer) and, when
 * `storePwdTemplatePath` is not NULL, "storePwd.ini" (the automatic-logon
 * helper's settings). Both answer files are always written; existing files
 * are overwritten. The templates are copied, then filled in:
 *  - productKey, adminPassword, language: optional (NULL or empty for none);
 *    without a language, "en-US" (Vista and newer) or "English" is used.
 *  - fullName: the registered owner and the local account name; in winnt.sif
 *    it and the password are written in the language's legacy Windows code
 *    page (UTF-8 when they have no equivalent there), in the XML as UTF-8.
 *  - guestOS, version: the identifier and GuessVersion that Guess_Guest
 *    found; guestOS must be a Windows identifier.
 *  - imageName: the image on the medium to install (one of the guess's
 *    editions), never NULL.
 *  - autoLogon: keep automatic logon after the first logon; keepPartitions:
 *    leave the template's disk layout instead of using the whole disk.
 * The host's time zone is filled into both answer files.
 * Returns TRUE when every file was copied and filled in. On FALSE the reason
 * is logged (tvx_log.h) and the files already written stay in outputDir. */
TVX_EXPORT Bool AutoInstall_PrepareAnswerFileEx(const char *sifTemplatePath,
                                                const char *xmlTemplatePath,
                                                const char *storePwdTemplatePath,
                                                const char *productKey, const char *fullName,
                                                const char *adminPassword, const char *guestOS,
                                                GuessVersion version, const char *outputDir,
                                                const char *language, const char *imageName,
                                                Bool autoLogon, Bool keepPartitions);

TVX_END_DECLS

#endif /* TVX_AUTOINSTALL_WINDOWS_H */
