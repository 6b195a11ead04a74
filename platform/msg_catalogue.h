// Internals shared by the message functions, the message lists and the
// dictionary loader (which posts its refusals to the pending list).
#pragma once

#include <cstdarg>
#include <map>
#include <string>
#include <vector>

// MsgPending_Add appends one finished message (trailing line ends dropped)
// to the calling thread's pending list.
void MsgPending_Add(std::string text);
// MsgPending_Join joins messages the way every message list is shown: "; "
// between them.
std::string MsgPending_Join(const std::vector<std::string> &messages);
// MsgCatalogue_Install replaces the catalogue of `locale`.
void MsgCatalogue_Install(const std::string &locale, std::map<std::string, std::string> texts);
// MsgEnglish_VFormat is Msg_VFormat with the default (English) text,
// whatever the locale.
char *MsgEnglish_VFormat(const char *idFmt, va_list args);
