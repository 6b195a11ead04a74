// Localised messages. A message id text is the marker "@&!*@*@", the id in
// parentheses and the default English text:
//   "@&!*@*@(msg.guessGuest.ubuntuServer)Server"
// The id is looked up in the catalogue of the current locale (if one was
// loaded); otherwise the default text is used. A text without the marker is
// used as it is.
#pragma once

#include "tvx_base.h"

#include <cstdarg>

// Msg_GetString returns the localised text (allocated), or null when the id
// text is malformed (marker without a closing parenthesis).
char *Msg_GetString(const char *idFmt);
// Msg_GetStringSafe is Msg_GetString that accepts null (and returns null for
// it); a malformed id text comes back as a copy of itself. A catalogue text
// whose printf conversions differ from the default text's is never used.
char *Msg_GetStringSafe(const char *idFmt);
// Msg_Format localises the id text and formats it with the arguments
// (allocated, never null).
char *Msg_Format(const char *idFmt, ...);
char *Msg_VFormat(const char *idFmt, va_list args);
// Msg_Append adds a localised, formatted message to the calling thread's
// pending list (trailing line ends dropped); Msg_GetMessagesAndReset returns
// the pending messages joined with "; " (allocated, possibly empty, never
// null) and clears the list. A malformed id text is formatted as it stands.
void Msg_Append(const char *idFmt, ...);
char *Msg_GetMessagesAndReset(void);
// Msg_LoadCatalogue loads a catalogue (dictionary format, see
// docs/dictionary-format.md: id = "text") for the given locale, replacing an
// earlier one; FALSE (with the reason on the pending list) when the file
// cannot be read or is malformed, or for the default locale. Msg_SetLocale
// selects the current locale ("" or "en" means defaults only). Process-wide;
// call before using the library.
Bool Msg_LoadCatalogue(const char *locale, const char *path);
void Msg_SetLocale(const char *locale);
