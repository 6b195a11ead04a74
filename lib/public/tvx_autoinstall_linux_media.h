/*
 * tvx_autoinstall_linux_media.h -- the media that carry a Linux answer file to
 * the new virtual machine: a FAT floppy image "autoinst.flp" (Ubuntu, SUSE,
 * SLES 10, Mandriva), or a boot tree copied from the install medium and
 * mastered into "autoinst.iso" (the Red Hat family).
 *
 * Conventions: tvx_base.h. In addition:
 *  1. The answer file is prepared first (tvx_autoinstall_linux.h): the boot
 *     arguments that the boot tree writes are read from the process-wide Linux
 *     answer-file table at the moment of the call, and a Red Hat answer file
 *     sets its row. Calls are therefore not reentrant.
 *  2. No path is ever handed to a shell. The mastering tool is started
 *     directly with an argument vector, so quotes, blanks, "$", backticks and
 *     backslashes in a path are taken literally. A relative path that begins
 *     with "-" is passed as "./-..." so that the tool cannot read it as an
 *     option.
 *  3. Every file written whole (the boot configuration, copied kernels, RAM
 *     disks and boot loaders, the tools files) replaces its target through a
 *     temporary file and a rename: no tail of an older, longer file stays, and
 *     a symbolic link planted at a target name is replaced, never followed.
 *  4. Failures return FALSE; what was written before the failure stays, as
 *     each function says.
 *
 * Decisions on the points the boot-configuration format leaves open
 *  1. Blanks. Runs of spaces and tabs separate the arguments of an `append`
 *     line; they never produce empty arguments. `kernel` and `append` lines
 *     may be indented with spaces and tabs (the boot loader accepts both), and
 *     a tab may separate the keyword from its value. `label` lines count only
 *     at the line's first character, as before. Trailing blanks of a `kernel`
 *     value are dropped.
 *  2. An entry whose `append` line has no "initrd=" is incomplete: the parser
 *     goes on to the next entry instead of failing, as it does for an entry
 *     without `append`.
 *  3. An empty or unreadable "isolinux.cfg" is treated like one that does not
 *     parse: the other ".cfg" files of its directory are tried (the suffix is
 *     compared without regard to case, for media with plain ISO 9660 names).
 *  4. An `append` line keeps whole arguments only: arguments that would take
 *     the kept text past 511 bytes are dropped, never cut in the middle.
 *     "initrd=" is recognised anywhere on the line.
 *  5. ldlinux.c32. A boot loader of version 5 or newer (its banner reads
 *     "ISOLINUX 5." or higher) does not start without ldlinux.c32 beside it.
 *     When the isolinux.bin that goes into the tree is such a one, the scan
 *     also copies "ldlinux.c32": from the same directory of the medium as the
 *     medium's isolinux.bin, or, for a caller's `isolinuxBinPath`, from beside
 *     that file, else from the host's syslinux installation
 *     ("/usr/lib/syslinux/modules/bios", "/usr/share/syslinux"). When none is
 *     found the scan fails: a tree that cannot boot is worse than an error.
 *  6. The medium's directory search does not follow symbolic links on the
 *     host and stops 32 directories deep.
 *  7. SLES 15 is kind 0 (not a Linux kind of the table) and so gets neither a
 *     floppy nor boot arguments.
 */
#ifndef TVX_AUTOINSTALL_LINUX_MEDIA_H
#define TVX_AUTOINSTALL_LINUX_MEDIA_H

#include "tvx_base.h"

TVX_BEGIN_DECLS

/* AutoInstall_NeedsFloppy_Linux: TRUE when the guest reads its answer file
 * from a floppy (Ubuntu, SUSE, SLES 10, Mandriva); FALSE for the Red Hat
 * family, unknown identifiers and NULL. */
TVX_EXPORT Bool AutoInstall_NeedsFloppy_Linux(const char *guestOS);

/* AutoInstall_MakeFloppyImg_Linux writes `floppyDir`/"autoinst.flp" holding
 * the answer file that was prepared into `answerDir`: a fresh 1.44 MB image
 * for Ubuntu ("custom/preseed.cfg" of answerDir, stored as "preseed.cfg"); a
 * copy of `templateDir`/"suse.flp" or "mandriva.flp" for SUSE, SLES 10 and
 * Mandriva. TRUE at once, without an image, for guests that need no floppy.
 * FALSE when the answer file or the template is missing or a FAT step fails,
 * including writing the image back when it is closed; an image begun before
 * the failure stays in floppyDir. */
TVX_EXPORT Bool AutoInstall_MakeFloppyImg_Linux(const char *answerDir, const char *floppyDir,
                                                const char *templateDir, const char *guestOS);

/* AutoInstall_AddTools_Linux copies the three guest-tools installer files of
 * `toolsDir` into `destinationDir` under short names ("upgra32", "upgra64",
 * "upgrade.sh"), in that order, stopping at the first failure (the files
 * copied before it stay). Logs nothing. */
TVX_EXPORT Bool AutoInstall_AddTools_Linux(const char *destinationDir, const char *toolsDir);

/* AutoInstall_MasterISO runs the ISO mastering tool `mkisofsPath` (a
 * genisoimage-compatible program: genisoimage, xorrisofs) over `treeDir`,
 * writing `outputDir`/"autoinst.iso" bootable from "isolinux/isolinux.bin"
 * (no emulation, 4 sectors, boot-info table). The tree is deleted afterwards,
 * whatever the tool's outcome. TRUE when the tool exited with status 0.
 * FALSE without touching anything when an argument is NULL. Logs nothing.
 * The tool's own output goes to the process's standard output and error. */
TVX_EXPORT Bool AutoInstall_MasterISO(const char *treeDir, const char *mkisofsPath,
                                      const char *outputDir);

/* AutoInstall_ScanISO finds the isolinux configuration of the install image
 * `isoPath`, takes the kernel, RAM disk and arguments of its first complete
 * boot entry and writes `outputDir`/"isolinux" holding the kernel and RAM
 * disk under their base names, "isolinux.bin" (from `isolinuxBinPath`,
 * optional, else from beside the medium's configuration), ldlinux.c32 when
 * that boot loader needs it, and a one-entry "isolinux.cfg" whose append line
 * adds the guest's boot arguments (for the Red Hat family without
 * "askmethod"). An Ubuntu 20.10 or newer medium without an isolinux
 * configuration boots /casper/vmlinuz and /casper/initrd. FALSE on any
 * failure, with what was written left in place; logs nothing. */
TVX_EXPORT Bool AutoInstall_ScanISO(const char *isoPath, const char *outputDir,
                                    const char *guestOS, uint32_t version,
                                    const char *isolinuxBinPath);

/* AutoInstall_ScanDisk is AutoInstall_ScanISO for a medium unpacked into the
 * host directory `sourceRoot`; it logs each failure. */
TVX_EXPORT Bool AutoInstall_ScanDisk(const char *sourceRoot, const char *outputDir,
                                     const char *guestOS, uint32_t version,
                                     const char *isolinuxBinPath);

TVX_END_DECLS

#endif /* TVX_AUTOINSTALL_LINUX_MEDIA_H */
