#include "platform/msglist.h"

#include <cstdlib>
#include <string>
#include <vector>

#include "platform/log.h"
#include "platform/msg.h"
#include "platform/msg_catalogue.h"
#include "platform/util.h"

struct MsgList {
  std::vector<std::string> english;
  std::vector<std::string> localised;
};

namespace {

std::string Trimmed(char *text) {
  std::string s(text);
  std::free(text);
  while (!s.empty() && (s.back() == '\n' || s.back() == '\r')) s.pop_back();
  return s;
}

}  // namespace

void MsgList_VAppend(MsgList **list, const char *idFmt, va_list args) {
  if (list == nullptr) return;
  if (*list == nullptr) *list = new MsgList;
  va_list copy;
  va_copy(copy, args);
  (*list)->english.push_back(Trimmed(MsgEnglish_VFormat(idFmt, copy)));
  va_end(copy);
  (*list)->localised.push_back(Trimmed(Msg_VFormat(idFmt, args)));
}

void MsgList_Append(MsgList **list, const char *idFmt, ...) {
  va_list args;
  va_start(args, idFmt);
  MsgList_VAppend(list, idFmt, args);
  va_end(args);
}

char *MsgList_ToEnglishString(const MsgList *list) {
  std::string all = list != nullptr ? MsgPending_Join(list->english) : std::string();
  return UtilSafeStrndup0(all.data(), all.size());
}

char *MsgList_ToString(const MsgList *list) {
  std::string all = list != nullptr ? MsgPending_Join(list->localised) : std::string();
  return UtilSafeStrndup0(all.data(), all.size());
}

void MsgList_Log(const MsgList *list) {
  if (list == nullptr) return;
  for (const auto &m : list->english) Log("%s\n", m.c_str());
}

Bool MsgList_IsEmpty(const MsgList *list) { return list == nullptr || list->english.empty(); }

void MsgList_Free(MsgList *list) { delete list; }
