#include "platform/dictionary.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string_view>

#include "platform/ascii.h"
#include "platform/dictionary_internal.h"
#include "platform/fileio.h"
#include "platform/msg_catalogue.h"
#include "platform/str.h"
#include "platform/unique.h"
#include "platform/util.h"

// Names are formats by design; callers' literals are checked through the
// TVX_PRINTF attributes in dictionary.h.
#pragma GCC diagnostic ignored "-Wformat-nonliteral"

namespace {

// Configuration files and manifests are small; anything this large is not
// one of them, and reading it whole would only waste memory.
constexpr uint64_t kMaxFileSize = 64u << 20;

DictionaryEntry *FindLast(const Dictionary *dict, const char *name) {
  auto &entries = const_cast<Dictionary *>(dict)->entries;
  for (auto it = entries.rbegin(); it != entries.rend(); ++it) {
    if (tvx::ascii::Equal(it->name, name)) return &*it;
  }
  return nullptr;
}

std::string FormatName(const char *fmt, va_list args) {
  tvx::CharPtr s(Str_Vasprintf(nullptr, fmt, args));
  return s ? s.get() : "";
}

bool Set(Dictionary *dict, const std::string &name, const std::string &value) {
  if (!tvx::IsWritableName(name)) return false;
  DictionaryEntry *last = FindLast(dict, name.c_str());
  if (last == nullptr) {
    dict->entries.push_back({name, value});
    return true;
  }
  last->value = value;
  // Drop earlier repeats so the value set is the only one a walk sees.
  auto &entries = dict->entries;
  for (size_t i = 0; i + 1 < entries.size();) {
    if (&entries[i] != last && tvx::ascii::Equal(entries[i].name, name)) {
      entries.erase(entries.begin() + static_cast<std::ptrdiff_t>(i));
      last = FindLast(dict, name.c_str());
    } else {
      i++;
    }
  }
  return true;
}

bool Load(Dictionary *dict, const char *buf, size_t size, MsgList **messages) {
  std::vector<DictionaryEntry> parsed;
  if (!tvx::ParseDictionaryText(buf, size, &parsed, messages)) return false;
  for (auto &e : parsed) dict->entries.push_back(std::move(e));
  return true;
}

}  // namespace

Dictionary *Dictionary_Create(void) { return new Dictionary; }

void Dictionary_Free(Dictionary *dict) { delete dict; }

Bool Dictionary_LoadEx(Dictionary *dict, const char *path, MsgList **messages) {
  FileIODescriptor fd;
  FileIOResult rc = FileIO_Open(&fd, path, FILEIO_OPEN_ACCESS_READ, FILEIO_OPEN);
  if (rc != FILEIO_SUCCESS) {
    MsgList_Append(messages, "@&!*@*@(msg.dictionary.open)cannot open \"%s\": %s", path,
                   FileIO_ErrorEnglish(rc));
    return FALSE;
  }
  uint64_t size = FileIO_GetSize(&fd);
  if (size == UINT64_MAX || size > kMaxFileSize) {
    FileIO_Close(&fd);
    MsgList_Append(messages, "@&!*@*@(msg.dictionary.size)\"%s\" is too large to be a dictionary",
                   path);
    return FALSE;
  }
  std::string text(static_cast<size_t>(size), '\0');
  size_t got = 0;
  rc = FileIO_Read(&fd, text.data(), text.size(), &got);
  FileIO_Close(&fd);
  if (rc != FILEIO_SUCCESS && rc != FILEIO_READ_ERROR_EOF) {
    MsgList_Append(messages, "@&!*@*@(msg.dictionary.read)cannot read \"%s\": %s", path,
                   FileIO_ErrorEnglish(rc));
    return FALSE;
  }
  text.resize(got);
  return Load(dict, text.data(), text.size(), messages);
}

Bool Dictionary_LoadFromBufferEx(Dictionary *dict, const char *buf, size_t size,
                                 MsgList **messages) {
  return Load(dict, buf, size, messages);
}

Bool Dictionary_LoadFromBuffer(Dictionary *dict, const char *buf, size_t size) {
  MsgList *messages = nullptr;
  bool ok = Load(dict, buf, size, &messages);
  if (!ok) {
    tvx::CharPtr text(MsgList_ToString(messages));
    MsgPending_Add(text.get());
  }
  MsgList_Free(messages);
  return ok;
}

char *Dictionary_WriteToBuffer(const Dictionary *dict, size_t *out_size) {
  std::string text = tvx::WriteDictionaryText(dict->entries);
  if (out_size != nullptr) *out_size = text.size();
  return UtilSafeStrndup0(text.data(), text.size());
}

size_t Dictionary_Iterate(const Dictionary *dict, DictionaryIterFn fn, void *ctx) {
  size_t visited = 0;
  // A copy, so a callback that changes the dictionary cannot break the walk.
  std::vector<DictionaryEntry> entries = dict->entries;
  for (const auto &e : entries) {
    visited++;
    if (!fn(e.name.c_str(), e.value.c_str(), ctx)) break;
  }
  return visited;
}

size_t Dictionary_NumberOfEntries(const Dictionary *dict) { return dict->entries.size(); }

Bool Dictionary_Get(const Dictionary *dict, const char *name, DictionaryType type, void *out) {
  const DictionaryEntry *e = FindLast(dict, name);
  if (e == nullptr) return FALSE;
  const char *v = e->value.c_str();
  switch (type) {
    case DICT_STRING:
      *static_cast<char **>(out) = UtilSafeStrdup0(v);
      return TRUE;
    case DICT_BOOL: {
      Bool t = Dictionary_StringToBool(v, TRUE);
      if (t != Dictionary_StringToBool(v, FALSE)) return FALSE;  // neither true nor false
      *static_cast<Bool *>(out) = t;
      return TRUE;
    }
    case DICT_INT32: {
      int32_t n = 0;
      if (!StrUtil_StrToInt(&n, v)) return FALSE;
      *static_cast<int32_t *>(out) = n;
      return TRUE;
    }
    case DICT_UINT32: {
      uint32_t n = 0;
      if (!StrUtil_StrToUint(&n, v)) return FALSE;
      *static_cast<uint32_t *>(out) = n;
      return TRUE;
    }
  }
  return FALSE;
}

Bool Dictionary_StringToBool(const char *text, Bool dflt) {
  if (text == nullptr) return dflt;
  while (*text == ' ' || *text == '\t') text++;
  size_t n = std::strlen(text);
  while (n > 0 && (text[n - 1] == ' ' || text[n - 1] == '\t')) n--;
  std::string_view word(text, n);
  for (const char *t : {"true", "yes", "on", "1"}) {
    if (tvx::ascii::Equal(word, t)) return TRUE;
  }
  for (const char *f : {"false", "no", "off", "0"}) {
    if (tvx::ascii::Equal(word, f)) return FALSE;
  }
  return dflt;
}

char *Dict_GetString(const Dictionary *dict, const char *dflt, const char *nameFmt, ...) {
  va_list args;
  va_start(args, nameFmt);
  std::string name = FormatName(nameFmt, args);
  va_end(args);
  const DictionaryEntry *e = FindLast(dict, name.c_str());
  return UtilSafeStrdup0(e != nullptr ? e->value.c_str() : dflt);
}

Bool Dict_GetBool(const Dictionary *dict, Bool dflt, const char *nameFmt, ...) {
  va_list args;
  va_start(args, nameFmt);
  std::string name = FormatName(nameFmt, args);
  va_end(args);
  Bool v = dflt;
  return Dictionary_Get(dict, name.c_str(), DICT_BOOL, &v) ? v : dflt;
}

Bool Dict_SetString(Dictionary *dict, const char *value, const char *nameFmt, ...) {
  va_list args;
  va_start(args, nameFmt);
  std::string name = FormatName(nameFmt, args);
  va_end(args);
  return Set(dict, name, value != nullptr ? value : "");
}

Bool Dict_SetBool(Dictionary *dict, Bool value, const char *nameFmt, ...) {
  va_list args;
  va_start(args, nameFmt);
  std::string name = FormatName(nameFmt, args);
  va_end(args);
  return Set(dict, name, value ? "TRUE" : "FALSE");
}
