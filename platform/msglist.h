// A list of messages that an operation hands back to its caller (instead of
// the thread's pending list of Msg_Append). Each message is kept both in
// English and localised.
#pragma once

#include "tvx_base.h"

#include <cstdarg>

struct MsgList;

// MsgList_Append formats a message id text (see msg.h) with the arguments
// and appends it to `*list` (a null list is an empty one; it is created).
// `list` itself may be null: the message is then dropped, so callers can
// pass an optional list straight through.
void MsgList_Append(MsgList **list, const char *idFmt, ...);
void MsgList_VAppend(MsgList **list, const char *idFmt, va_list args);
// MsgList_ToEnglishString / MsgList_ToString join the messages with "; "
// (allocated, never null; "" for an empty list).
char *MsgList_ToEnglishString(const MsgList *list);
char *MsgList_ToString(const MsgList *list);
// MsgList_Log logs every message, English, one Log line each ending in "\n".
void MsgList_Log(const MsgList *list);
Bool MsgList_IsEmpty(const MsgList *list);
// MsgList_Free releases the list; null is harmless.
void MsgList_Free(MsgList *list);

#include "platform/unique.h"
namespace tvx {
TVX_MAKE_DELETER(MsgList, MsgList_Free);
}  // namespace tvx
