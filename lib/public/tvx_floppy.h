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
 * was copied before it. The image is written back when `dir` (or the
 * volume) is closed. */
TVX_EXPORT Bool AddFileToFloppyImg(FATDirectory *dir, const char *hostPath,
                                   const char *imageName);

/* GetFileFromFloppyImg copies the file `imageName` of the open FAT directory
 * `dir` to the host file `hostPath` (created, or emptied when it exists), in
 * 512-byte blocks. Note the order of the two names: the source comes first,
 * as in AddFileToFloppyImg. TRUE on success; a host file that was created
 * keeps what was copied before a failure. */
TVX_EXPORT Bool GetFileFromFloppyImg(FATDirectory *dir, const char *imageName,
                                     const char *hostPath);

TVX_END_DECLS

#endif /* TVX_FLOPPY_H */
