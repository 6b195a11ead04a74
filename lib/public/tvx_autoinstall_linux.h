/*
 * tvx_autoinstall_linux.h -- the answer file of an unattended Linux
 * installation, and the SHA-256 password crypt it encrypts passwords with.
 *
 * Conventions: tvx_base.h. In addition:
 *  1. Preparation is single-threaded like every unattended-install call: the
 *     Linux answer-file table (boot argument of the Red Hat family) and the
 *     salt generator are process-wide. One answer file at a time.
 *  2. Answer files are written whole and crash-safe: a rewrite replaces the
 *     old file (no tail of a longer old file stays), the file is created
 *     mode 0600 because it holds passwords, and a symbolic link planted at
 *     its name is replaced, never written through.
 *  3. SHA256_crypt and b64_from_24bit have no state and are reentrant.
 */
#ifndef TVX_AUTOINSTALL_LINUX_H
#define TVX_AUTOINSTALL_LINUX_H

#include "tvx_base.h"

TVX_BEGIN_DECLS

/* SHA256_crypt encrypts `key` with `salt` in the SHA-256 crypt scheme and
 * writes the result, "$5$[rounds=N$]SALT$" and 43 digest characters, NUL
 * terminated, into `buffer`. `salt` may carry the "$5$" prefix and a
 * "rounds=N$" parameter (N clamped to 1000..999999999); at most 16 salt
 * characters are used, up to the first '$'. Returns `buffer`, or NULL.
 *
 * Decisions on the points the scheme leaves open:
 *  1. buflen: nothing is ever written at or past buffer[buflen] (a negative
 *     buflen counts as 0). When the whole result and its NUL do not fit,
 *     the result is NULL and buffer holds the first buflen characters of the
 *     result, NOT terminated, wherever the cut falls: inside "$5$", inside
 *     "rounds=N$" (the digits that fit, never a terminator from a formatter)
 *     or inside the salt or digest. A result of L characters needs
 *     buflen >= L + 1.
 *  2. The rounds parameter is taken only as one or more ASCII digits right
 *     after "rounds=" and directly followed by '$'. "rounds=$", "rounds=+5$",
 *     "rounds= 5$" and "rounds=5x$" are salt text like any other (so the
 *     salt is "rounds=", or the first 16 characters of the text), with the
 *     default 5000 rounds. A number too large for any integer is clamped to
 *     999999999 like any other large count.
 *  3. Keys longer than 256 bytes are refused: the result is NULL, buffer[0]
 *     is set to NUL when buflen > 0, and a log line says why. The work
 *     buffers are fixed and on the stack, and the answer-file password is
 *     limited to 127 bytes anyway.
 *  4. Every intermediate digest, the key-derived byte sequences and the
 *     digest contexts are wiped before return, on every path. */
TVX_EXPORT char *SHA256_crypt(const char *key, const char *salt, char *buffer, int buflen);

/* b64_from_24bit appends the n low 6-bit groups of B2*65536 + B1*256 + B0,
 * least significant first, in the crypt alphabet
 * "./0-9A-Za-z" to *cp, as long as *buflen > 0; each character advances *cp
 * and decreases *buflen. No terminator is written. */
TVX_EXPORT void b64_from_24bit(unsigned char B2, unsigned char B1, unsigned char B0, int n,
                               int *buflen, char **cp);

/* AutoInstall_PrepareAnswerFileEx_Linux writes the answer file of a Linux
 * guest: "ks.cfg" (Red Hat family), "custom/preseed.cfg" (Ubuntu),
 * "autoinst.xml" (SUSE, SLES 10) or "auto_i~1.cfg" (Mandriva) in
 * `outputDir`, which is created with its missing parents.
 *  - guestOS, version: the identifier and GuessVersion that Guess_Guest found.
 *  - userName: the login name of the account; fullName: its full name.
 *  - userPassword, rootPassword: the clear passwords (root's also for
 *    Ubuntu, whose file does not use it). Every file but Mandriva's carries
 *    only their "$5$" SHA-256 crypt forms (fresh 16-character salt); the
 *    crypt is made from the text as typed, so the typed password verifies.
 *  - installationKey: optional (NULL or empty: the Red Hat installer skips
 *    its key question).
 *  - powerOff: power the guest off after the install instead of rebooting.
 *  - reserved: not read. nvmeDisk: the guest's disk is NVMe (Ubuntu only).
 * For the Red Hat family the boot argument that points the installer at
 * ks.cfg is stored for the medium builders that run next (process-wide, and
 * only when the file was written).
 * Returns TRUE when the whole file was written.
 *
 * How typed texts are kept inert (no typed text ever runs as code in the
 * guest):
 *  a. userName must satisfy the guest's short-name rule
 *     (AutoInstallValidateLinuxText, AUTOINSTALL_TEXT_SHORT_NAME: 'a'-'z',
 *     '0'-'9', '-'; Ubuntu: a letter first), else the call is refused.
 *  b. fullName must be valid UTF-8 without control characters (C0, DEL, C1)
 *     and without U+FFFE/U+FFFF (XML cannot carry them), and must not
 *     end in a backslash (which would join the next preseed line), else
 *     refused. Everything else is kept intact and escaped for where it lands:
 *     in the kickstart's `chfn -f "..."` shell line \ " $ ` get a backslash;
 *     in the Mandriva Perl file's "..." string \ " $ @ get a backslash; in
 *     the preseed value (one line, read literally) nothing is changed; in
 *     the AutoYaST CDATA section a "]]>" is split across two CDATA sections.
 *     So `Jo "JJ" O'Neil & Co <x> Zoe` arrives as typed everywhere.
 *  c. Passwords may hold any bytes. Where they land crypted only the crypt
 *     alphabet is written; Mandriva's clear password is Perl-escaped as in b.
 *  d. installationKey may hold only ASCII letters, digits and '-', else
 *     refused (it is a word on a kickstart command line).
 * A refused text is logged as "AutoInstall_PrepareAnswerFileEx_Linux: ...".
 * This replaces the plain quote-escaping of older answer files, which left
 * $(...), backticks and @array in a full name live in the guest.
 *
 * What stays behind on failure: nothing new. Unrecognised guests (no Linux
 * kind), NULL texts and refused texts are detected before anything is
 * created; directories created for a file that then cannot be written are
 * removed again; an existing answer file is left as it was. */
TVX_EXPORT Bool AutoInstall_PrepareAnswerFileEx_Linux(
    const char *guestOS, uint32_t version, const char *outputDir, const char *userName,
    const char *fullName, const char *userPassword, const char *rootPassword,
    const char *installationKey, Bool powerOff, uint32_t reserved, Bool nvmeDisk);

TVX_END_DECLS

#endif /* TVX_AUTOINSTALL_LINUX_H */
