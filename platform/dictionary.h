// Dictionaries: ordered lists of named text entries, read from and written
// to the text format described in docs/dictionary-format.md. Used for VM
// configuration files, manifests, the tools image map and message
// catalogues.
//
// Names are looked up without regard to ASCII case; when a name occurs more
// than once (a loaded text may repeat one), lookups see the last occurrence
// while walks see every entry, in order.
#pragma once

#include "tvx_base.h"
#include "tvx_dictionary.h"  // the exported calls (C linkage)

#include <cstddef>
#include <cstdint>

#include "platform/msglist.h"

struct Dictionary;

enum DictionaryType {
  DICT_STRING = 0,  // out: char ** (allocated)
  DICT_BOOL = 1,    // out: Bool *
  DICT_INT32 = 2,   // out: int32_t * (decimal or 0x-hex, optional sign)
  DICT_UINT32 = 3,  // out: uint32_t *
};

// DictionaryIterFn is called per entry; returning FALSE stops the walk.
typedef Bool (*DictionaryIterFn)(const char *name, const char *value, void *ctx);

// Dictionary_Create returns an empty dictionary (never null).
Dictionary *Dictionary_Create(void);
// Dictionary_Free releases it; null is harmless.
void Dictionary_Free(Dictionary *dict);

// Dictionary_LoadEx appends the entries of the file at `path`. On failure
// nothing is added, FALSE is returned and the reasons ("line 3: ...", or why
// the file could not be read) are appended to `*messages` (optional).
Bool Dictionary_LoadEx(Dictionary *dict, const char *path, MsgList **messages);
// Dictionary_LoadFromBufferEx is Dictionary_LoadEx over `size` bytes in
// memory (NUL bytes in them are refused).
Bool Dictionary_LoadFromBufferEx(Dictionary *dict, const char *buf, size_t size,
                                 MsgList **messages);
// Dictionary_LoadFromBuffer is the same, with the reasons appended to the
// calling thread's pending messages (Msg_Append / Msg_GetMessagesAndReset).
Bool Dictionary_LoadFromBuffer(Dictionary *dict, const char *buf, size_t size);

// Dictionary_WriteToBuffer returns the whole dictionary in the text format,
// one `name = "value"` line per entry (allocated, never null); `out_size`
// (optional) receives its length. Loading it gives back the same entries.
char *Dictionary_WriteToBuffer(const Dictionary *dict, size_t *out_size);

// Dictionary_Iterate walks the entries in order and returns how many were
// visited (all of them unless the callback stopped the walk).
size_t Dictionary_Iterate(const Dictionary *dict, DictionaryIterFn fn, void *ctx);
size_t Dictionary_NumberOfEntries(const Dictionary *dict);
// Dictionary_Get reads the entry as `type` into `out`; FALSE when it is
// absent or its value is not of that type (then `out` is untouched).
Bool Dictionary_Get(const Dictionary *dict, const char *name, DictionaryType type, void *out);

// Dictionary_StringToBool reads "true", "yes", "on", "1" as TRUE and
// "false", "no", "off", "0" as FALSE (any case, surrounding blanks ignored);
// any other text (or null) gives `dflt`.
Bool Dictionary_StringToBool(const char *text, Bool dflt);

// The Dict_* calls name the entry with a printf format. Getters return the
// value, or `dflt` when the entry is absent (or, for bool and number, not of
// that type). Dict_GetString returns an allocated copy (null only when
// absent and `dflt` is null).
char *Dict_GetString(const Dictionary *dict, const char *dflt, const char *nameFmt, ...)
    TVX_PRINTF(3, 4);
Bool Dict_GetBool(const Dictionary *dict, Bool dflt, const char *nameFmt, ...) TVX_PRINTF(3, 4);
// Setters replace the value of the last entry of that name (dropping earlier
// repeats) or append a new entry. Bools are stored as "TRUE" / "FALSE".
// FALSE when the name cannot be written in the text format (empty, or holding
// blanks, "=", "#", a double quote or control characters).
Bool Dict_SetString(Dictionary *dict, const char *value, const char *nameFmt, ...)
    TVX_PRINTF(3, 4);
Bool Dict_SetBool(Dictionary *dict, Bool value, const char *nameFmt, ...) TVX_PRINTF(3, 4);

#include "platform/unique.h"
namespace tvx {
TVX_MAKE_DELETER(Dictionary, Dictionary_Free);
}  // namespace tvx
