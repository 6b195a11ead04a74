#include "platform/msg.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <map>
#include <memory>
#include <mutex>
#include <shared_mutex>
#include <string>
#include <vector>

#include "platform/msg_catalogue.h"
#include "platform/util.h"

// Catalogue texts are formats by design; their conversions are checked
// against the default text's before a catalogue text is used.
#pragma GCC diagnostic ignored "-Wformat-nonliteral"

namespace {

constexpr char kMarker[] = "@&!*@*@";
constexpr size_t kMarkerLen = sizeof kMarker - 1;

struct Catalogues {
  std::shared_mutex lock;
  std::map<std::string, std::map<std::string, std::string>> byLocale;
  std::string current;
};

Catalogues &State() {
  static Catalogues *c = new Catalogues;  // never destroyed: used until exit
  return *c;
}

thread_local std::vector<std::string> t_pending;

// Split parses "marker(id)default"; false for a marker without "(...)".
// A text without the marker is its own default with no id.
bool Split(const char *idFmt, std::string *id, const char **dflt) {
  id->clear();
  if (std::strncmp(idFmt, kMarker, kMarkerLen) != 0) {
    *dflt = idFmt;
    return true;
  }
  const char *open = idFmt + kMarkerLen;
  if (*open != '(') return false;
  const char *close = std::strchr(open, ')');
  if (close == nullptr || close == open + 1) return false;
  id->assign(open + 1, close);
  *dflt = close + 1;
  return true;
}

// Conversions returns the printf conversions of a text ("%s", "%d", "%lu"
// ...), so that a translated format can be proved to take the same arguments.
std::string Conversions(const std::string &fmt) {
  std::string out;
  for (size_t i = 0; i < fmt.size(); i++) {
    if (fmt[i] != '%') continue;
    size_t j = i + 1;
    if (j < fmt.size() && fmt[j] == '%') {
      i = j;
      continue;
    }
    while (j < fmt.size() && std::strchr("-+ #0123456789.*'", fmt[j]) != nullptr) {
      if (fmt[j] == '*') out += '*';
      j++;
    }
    while (j < fmt.size() && std::strchr("hlLqjzt", fmt[j]) != nullptr) out += fmt[j++];
    if (j < fmt.size()) out += fmt[j];
    out += ',';
    i = j;
  }
  return out;
}

std::string Localise(const std::string &id, const char *dflt) {
  if (id.empty()) return dflt;
  Catalogues &c = State();
  std::shared_lock guard(c.lock);
  auto loc = c.byLocale.find(c.current);
  if (loc == c.byLocale.end()) return dflt;
  auto it = loc->second.find(id);
  if (it == loc->second.end()) return dflt;
  if (Conversions(it->second) != Conversions(dflt)) return dflt;
  return it->second;
}

char *Dup(const std::string &s) { return UtilSafeStrndup0(s.data(), s.size()); }

std::string FormatV(const std::string &fmt, va_list args) {
  va_list copy;
  va_copy(copy, args);
  int n = std::vsnprintf(nullptr, 0, fmt.c_str(), copy);
  va_end(copy);
  if (n < 0) return fmt;
  std::string out(static_cast<size_t>(n) + 1, '\0');
  std::vsnprintf(out.data(), out.size(), fmt.c_str(), args);
  out.resize(static_cast<size_t>(n));
  return out;
}

// LocalisedFormat is the format text Msg_Format uses: a malformed id text is
// formatted as it stands.
std::string LocalisedFormat(const char *idFmt, bool english = false) {
  std::string id;
  const char *dflt = nullptr;
  if (!Split(idFmt, &id, &dflt)) return idFmt;
  return english ? std::string(dflt) : Localise(id, dflt);
}

}  // namespace

char *Msg_GetString(const char *idFmt) {
  std::string id;
  const char *dflt = nullptr;
  if (!Split(idFmt, &id, &dflt)) return nullptr;
  return Dup(Localise(id, dflt));
}

char *Msg_GetStringSafe(const char *idFmt) {
  if (idFmt == nullptr) return nullptr;
  char *s = Msg_GetString(idFmt);
  return s != nullptr ? s : UtilSafeStrdup0(idFmt);
}

char *Msg_VFormat(const char *idFmt, va_list args) { return Dup(FormatV(LocalisedFormat(idFmt), args)); }

char *MsgEnglish_VFormat(const char *idFmt, va_list args) {
  return Dup(FormatV(LocalisedFormat(idFmt, true), args));
}

char *Msg_Format(const char *idFmt, ...) {
  va_list args;
  va_start(args, idFmt);
  char *out = Msg_VFormat(idFmt, args);
  va_end(args);
  return out;
}

void MsgPending_Add(std::string text) {
  while (!text.empty() && (text.back() == '\n' || text.back() == '\r')) text.pop_back();
  t_pending.push_back(std::move(text));
}

std::string MsgPending_Join(const std::vector<std::string> &messages) {
  std::string all;
  for (const auto &m : messages) {
    if (!all.empty()) all += "; ";
    all += m;
  }
  return all;
}

void Msg_Append(const char *idFmt, ...) {
  va_list args;
  va_start(args, idFmt);
  std::string text = FormatV(LocalisedFormat(idFmt), args);
  va_end(args);
  MsgPending_Add(std::move(text));
}

char *Msg_GetMessagesAndReset(void) {
  std::string all = MsgPending_Join(t_pending);
  t_pending.clear();
  return Dup(all);
}

void Msg_SetLocale(const char *locale) {
  Catalogues &c = State();
  std::unique_lock guard(c.lock);
  c.current = locale != nullptr && std::strcmp(locale, "en") != 0 ? locale : "";
}

void MsgCatalogue_Install(const std::string &locale, std::map<std::string, std::string> texts) {
  Catalogues &c = State();
  std::unique_lock guard(c.lock);
  c.byLocale[locale] = std::move(texts);
}
