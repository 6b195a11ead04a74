/*
 * tvx_dictionary.h -- the library's named-value dictionaries, for callers
 * that hand the library a virtual machine's configuration.
 *
 * 1. A Dictionary is an ordered list of named text entries; names are looked
 *    up without regard to ASCII case, and when a name repeats, lookups see
 *    the last occurrence. The text format (one `name = "value"` line per
 *    entry, "#" comments) is described in docs/dictionary-format.md.
 * 2. Dictionary and MsgList are opaque handles. A Dictionary is created with
 *    Dictionary_Create and released with Dictionary_Free; a message list is
 *    released by the library call that takes it, or by the caller through
 *    the MsgList texts it is turned into (see Dictionary_LoadEx).
 * 3. Names are printf formats: pass "%s" and the name when the name is not a
 *    literal. Texts returned are malloc'd and the caller frees them with free().
 * Conventions: tvx_base.h.
 */
#ifndef TVX_DICTIONARY_H
#define TVX_DICTIONARY_H

#include "tvx_base.h"

TVX_BEGIN_DECLS

typedef struct Dictionary Dictionary;
typedef struct MsgList MsgList;

/* Dictionary_Create returns an empty dictionary (never NULL). */
TVX_EXPORT Dictionary *Dictionary_Create(void);
/* Dictionary_Free releases it; NULL is harmless. */
TVX_EXPORT void Dictionary_Free(Dictionary *dict);
/* Dictionary_LoadEx appends the entries of the file at `path`. FALSE when the
 * file cannot be read or breaks the format: nothing is added then, and when
 * `messages` (optional) is given, the reasons are appended to *messages.
 * Pass NULL: the exported API offers no call to read or free a message list,
 * so a caller outside the library always passes NULL. */
TVX_EXPORT Bool Dictionary_LoadEx(Dictionary *dict, const char *path, MsgList **messages);
/* Dict_SetString sets the entry named by the format to `value` (replacing the
 * last entry of that name and dropping earlier repeats, or appending). FALSE
 * when the name cannot be written in the text format (empty, or holding
 * blanks, "=", "#", a double quote or control characters). */
TVX_EXPORT Bool Dict_SetString(Dictionary *dict, const char *value, const char *nameFmt, ...)
    TVX_PRINTF(3, 4);
/* Dict_GetString returns a malloc'd copy of the entry's value, or of `dflt`
 * (optional) when the entry is absent; NULL only when both are missing. */
TVX_EXPORT char *Dict_GetString(const Dictionary *dict, const char *dflt, const char *nameFmt,
                                ...) TVX_PRINTF(3, 4);

TVX_END_DECLS

#endif /* TVX_DICTIONARY_H */
