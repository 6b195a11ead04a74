/*
 * tvx_floppy.h -- unattended-install floppies: moving whole files between
 * the host and a FAT image (tvx_fat.h), and the Windows install floppy
 * "autoinst.flp" with the answer files, helpers and mass-storage drivers.
 * Conventions: tvx_base.h.
 *
 * Every failure is logged (tvx_log.h) as a line that begins with the
 * function's name and a colon. Nothing is rolled back: what a failed call
 * wrote stays where it was written, as each function says. Single-threaded
 * like every unattended-install call.
 */
#ifndef TVX_FLOPPY_H
#define TVX_FLOPPY_H

#include "tvx_base.h"
#include "tvx_fat.h"

TVX_BEGIN_DECLS

/* AddFileToFloppyImg copies the host file `hostPath` into the open FAT
 * directory `dir` as `imageName`, in 512-byte blocks. An existing file of
 * that name is overwritten in place (cut to 0 bytes, then written), never
 * deleted and re-created; otherwise the file is created. TRUE on success.
 * When the host file cannot be opened nothing in the image is touched; after
 * a later failure (the volume full, among others) the image file keeps what
 * was copied before it. The image file is written when the copied file is
 * closed at the end; a failure to write it fails the call (logged as a
 * failed FAT_WriteFile). */
TVX_EXPORT Bool AddFileToFloppyImg(FATDirectory *dir, const char *hostPath,
                                   const char *imageName);

/* GetFileFromFloppyImg copies the file `imageName` of the open FAT directory
 * `dir` to the host file `hostPath` (created, or emptied when it exists), in
 * 512-byte blocks. Note the order of the two names: the source comes first,
 * as in AddFileToFloppyImg. TRUE on success; a host file that was created
 * keeps what was copied before a failure. */
TVX_EXPORT Bool GetFileFromFloppyImg(FATDirectory *dir, const char *imageName,
                                     const char *hostPath);

/* AutoInstall_MakeFloppyImg builds "autoinst.flp" in `guestConfigDir` for
 * the setup of Windows 2000, XP and Server 2003, from the answer files that
 * AutoInstall_PrepareAnswerFileEx (tvx_autoinstall_windows.h) wrote there:
 *  - the image: a copy of `baseFloppyPath` (optional), else a new 1.44 MB
 *    floppy;
 *  - the driver set, with `scsiDriverDir` (optional): the folder of that
 *    path inside the tools ISO `toolsIsoPath` (optional), extracted into
 *    `guestConfigDir`/"scsi"; without `toolsIsoPath`, the host folder
 *    `scsiDriverDir` itself; when `toolsIsoPath` names no file, the files of
 *    `resourceDir`/"tvxscsi.flp" (names lower-cased). Every driver file goes
 *    on the floppy and is named in winnt.sif section [OEMBootFiles]; the set's
 *    txtsetup.oem gives the [MassStorageDrivers] entry (WriteOEMDriverInfo);
 *  - "winnt.sif", "autoun~0.xml"; "storePwd.ini" and `resourceDir`/
 *    "storePwd.exe" when the former exists;
 *  - "upgrader.exe": "TarvexToolsUpgrader.exe" from the folder
 *    `upgraderIsoDir` (optional) of the tools ISO;
 *  - `resourceDir`/"unattend.cmd".
 * `guestConfigDir` and `resourceDir` are required (FALSE at once, nothing
 * logged or touched). TRUE when every mandatory file is on the floppy. On
 * every path the answer files, the upgrader copy and the extracted drivers
 * are removed from `guestConfigDir` afterwards (a new attempt needs new
 * answer files); "autoinst.flp" stays, also after a failure. Paths inside
 * the tools ISO may start with "/" or not.
 *
 * Decisions on the points the procedure leaves open
 *  1. Without `guestConfigDir` or `resourceDir` nothing is removed: the
 *     clean-up belongs to a run that got as far as naming its files.
 *  2. A failed extraction of the driver folder from the tools ISO, and any
 *     failure while taking the files off the driver floppy, is fatal: a
 *     floppy with half a driver set would fail later, inside the guest.
 *     Only two failures are tolerated: a driver file that cannot be added
 *     (logged and left out), and a missing upgrader when the tools ISO
 *     file does not exist.
 *  3. The driver floppy is copied into the driver folder as "TVXSCSI.FLP":
 *     upper case, so no lower-cased name taken out of it can meet it. Names
 *     on it that are not plain file names (holding "/") fail the call.
 *  4. The driver folder is removed (when empty after the clean-up) only
 *     when it is the "scsi" folder of `guestConfigDir`; the caller's own
 *     host folder is never emptied or removed.
 *  5. "autoinst.flp" is created owner-only (0600) through a temporary file,
 *     also when copied from `baseFloppyPath`: it may carry storePwd.ini. A
 *     symbolic link at its name is replaced, never written through.
 *  6. The upgrader is taken out of the ISO under its exact name in
 *     `guestConfigDir`, whatever the letter case of its name in the image. */
TVX_EXPORT Bool AutoInstall_MakeFloppyImg(const char *baseFloppyPath, const char *guestConfigDir,
                                          const char *toolsIsoPath, const char *scsiDriverDir,
                                          const char *upgraderIsoDir, const char *resourceDir);

/* AutoInstall_AddFileToFloppyImg adds the host file `srcPath` to the root of
 * `guestConfigDir`/"autoinst.flp" as `nameOnFloppy` (AddFileToFloppyImg).
 * The image must exist: a missing "autoinst.flp" is not created (FALSE).
 * FALSE for any failure, including writing the image back. */
TVX_EXPORT Bool AutoInstall_AddFileToFloppyImg(const char *srcPath, const char *nameOnFloppy,
                                               const char *guestConfigDir);

/* WriteOEMDriverInfo reads the driver set's `txtsetupOemPath` and writes its
 * driver's description into section [MassStorageDrivers] of `winntSifPath`:
 * the key is the description with its double quotes, the value OEM. The
 * description comes from the first line that names one of the known drivers
 * (tvxscsi, TVXSCSI, SYMMPI_32, LSI_SCSI_AMD64, LSI_SAS_AMD64, SYMMPI_1068,
 * LSI_SAS_32, LSI_SAS_X64, LSI_SCSI_IA64, LSI_SCSI_32, SYMMPI_IA64; letter
 * case counts) before its first "=" and holds a quoted text after it. A
 * missing or empty file is ignored silently; a file without such a line
 * logs a warning.
 *
 * Decision: the first entry written ends the walk, so a set that lists
 * several drivers yields one entry: setup loads one driver per set. */
TVX_EXPORT void WriteOEMDriverInfo(const char *txtsetupOemPath, const char *winntSifPath);

TVX_END_DECLS

#endif /* TVX_FLOPPY_H */
