/*
 * tvx_ini.h -- reading and editing single values of INI-style text files.
 *
 * The format: "[name]" section headers, "key=value" lines, ";" comment
 * lines. Files are 8-bit text and nothing is decoded. Each call opens, scans
 * and closes the file; there is no cache or handle. Conventions: tvx_base.h.
 *
 * Reading rules
 *  - A line is consumed in pieces of at most 1023 bytes: a longer physical
 *    line is seen as several consecutive lines.
 *  - The first byte decides the kind of line: ";" comment, "[" header (name up
 *    to the first "]"), anything else is a key line.
 *  - Section names and keys compare without regard to ASCII case.
 *  - A key runs from the first byte that is not a blank up to the first "=";
 *    blanks before the "=" belong to the key.
 *  - Readers cut a line at its first ";" after the first byte (an inline
 *    comment, quoted values included); the value then loses leading blanks
 *    and trailing blanks and line ends, is clipped to the buffer, and loses
 *    one pair of enclosing double quotes.
 *
 * Writing rules
 *  - A written key line is "key\n" for an empty value, "key=\"value\"\n" when
 *    quoted, else "key=value\n"; a new section is "[name]\n". Nothing is
 *    escaped. Only "\n" ends the lines the writer produces.
 *  - An existing key keeps its place and gets its new value behind the "=";
 *    a missing key goes at the end of its section, a missing section with its
 *    key at the end of the file.
 *  - The rewritten file may hold at most 522,240 bytes before the last key
 *    line is added; a larger file is refused and left unchanged.
 *  - The file must exist; the writer never creates one.
 *
 * Decisions on the points the format leaves open
 *  1. A bare key line ("key" with no "=", as the writer produces for an empty
 *     value) matches its key: the readers give the empty value, and the
 *     writer replaces that line with the key line of the new value, in the
 *     same form as a newly added key.
 *  2. When the file's last line lacks its newline and the writer appends a
 *     header or key line behind it, a "\n" is inserted first, so the old last
 *     line is never glued to the new one.
 *  3. The rewrite is crash-safe: the new text goes to a temporary file in the
 *     same directory, which is flushed to disk, given the old file's
 *     permission bits and renamed over the old file. On any failure (full
 *     disk included) the old file stays as it was and the temporary file is
 *     removed. The file's inode therefore changes on every successful write.
 *
 * What a caller must check before writing (the format's own rules, kept
 * as they are; the writer still returns TRUE in each case)
 *  - Values are written as given: a CR or LF inside a value starts a new line
 *    that readers take as a key or a section of its own, and a double quote
 *    inside a quoted value ends it early. Refuse such values first.
 *  - A ";" inside a value is written, but every reader here cuts the value
 *    at it (quoted or not): the value does not read back whole.
 *  - A value too long for its line (about 1,000 bytes: 1,020 minus the key
 *    and "=") is clipped, and the call still returns TRUE.
 *  - Replacing a key on a CRLF line writes the new line with "\n" alone; the
 *    other lines keep their CRLF.
 *
 * Concurrency: no locking; callers serialise writers of one file.
 */
#ifndef TVX_INI_H
#define TVX_INI_H

#include "tvx_base.h"

TVX_BEGIN_DECLS

/* IniUtil_GetIniFileString copies the value of `key` in `section` of `path`
 * into `out_value` (`size` bytes, terminated). TRUE when the key was found and
 * copied, and also when the file ended without the key (out_value is then left
 * as the caller filled it). FALSE when out_value is NULL or size < 1, when the
 * file cannot be opened for reading, or when a header line met during the scan
 * lacks its "]". */
TVX_EXPORT Bool IniUtil_GetIniFileString(const char *path, const char *section,
                                         const char *key, char *out_value, int32_t size);

/* IniUtil_GetIniFileInt reads the value as a base-10 strtol number (leading
 * blanks and trailing non-digits accepted). FALSE when out_value is NULL or
 * the read fails. Otherwise *out_value gets the number, and the result is TRUE
 * when the value is exactly "0" or converts to a non-zero number; a missing
 * key or a value that converts to 0 gives 0 and FALSE. */
TVX_EXPORT Bool IniUtil_GetIniFileInt(const char *path, const char *section,
                                      const char *key, int32_t *out_value);

/* IniUtil_WriteIniFileString sets `key` in `section` to `value` (between
 * double quotes when `quoted`). TRUE when the file was rewritten. FALSE, with
 * the file unchanged, when the file does not exist or cannot be read, a header
 * line lacks its "]", the text would exceed the size limit, or the new file
 * cannot be written (no space, no permission on the directory). Also refused:
 * a line break in any argument, and a section or key that the reading rules
 * could never find again (a section holding "]" or ";"; an empty key, or one
 * holding "=", ";" or a CR, or beginning with "[" or a blank; either too long
 * for one line). A
 * value too long for its line is clipped so that the line stays within 1023
 * bytes. When the old key line was longer than one piece, its remaining
 * pieces go with the old value. */
TVX_EXPORT Bool IniUtil_WriteIniFileString(const char *path, const char *section,
                                           const char *key, const char *value,
                                           Bool quoted);

/* IniUtil_WriteIniFileInt writes `value` as "%d", unquoted. */
TVX_EXPORT Bool IniUtil_WriteIniFileInt(const char *path, const char *section,
                                        const char *key, int32_t value);

TVX_END_DECLS

#endif /* TVX_INI_H */
