#include "platform/util.h"

#include <cstdlib>
#include <cstring>
#include <string_view>

#include "platform/log.h"

void *UtilSafeMalloc0(size_t size) {
  void *p = std::malloc(size == 0 ? 1 : size);
  if (p == nullptr) Panic("UtilSafeMalloc0: cannot allocate %zu bytes\n", size);
  std::memset(p, 0, size == 0 ? 1 : size);
  return p;
}

void *UtilSafeCalloc0(size_t count, size_t size) {
  if (count == 0 || size == 0) return UtilSafeMalloc0(0);
  void *p = std::calloc(count, size);
  if (p == nullptr) Panic("UtilSafeCalloc0: cannot allocate %zu x %zu bytes\n", count, size);
  return p;
}

char *UtilSafeStrdup0(const char *s) {
  if (s == nullptr) return nullptr;
  return UtilSafeStrndup0(s, std::strlen(s));
}

char *UtilSafeStrndup0(const char *s, size_t n) {
  if (s == nullptr) return nullptr;
  size_t len = strnlen(s, n);
  char *p = static_cast<char *>(std::malloc(len + 1));
  if (p == nullptr) Panic("UtilSafeStrndup0: cannot allocate %zu bytes\n", len + 1);
  std::memcpy(p, s, len);
  p[len] = '\0';
  return p;
}

namespace {

struct Component {
  std::string_view digits;  // numeric prefix, leading zeros removed
  std::string_view tail;    // whatever follows it up to the next dot
};

Component NextComponent(std::string_view &rest) {
  size_t dot = rest.find('.');
  std::string_view part = rest.substr(0, dot);
  rest = dot == std::string_view::npos ? std::string_view() : rest.substr(dot + 1);
  size_t n = 0;
  while (n < part.size() && part[n] >= '0' && part[n] <= '9') n++;
  std::string_view digits = part.substr(0, n);
  while (!digits.empty() && digits.front() == '0') digits.remove_prefix(1);
  return {digits, part.substr(n)};
}

// Compares digit strings of any length without converting, so components
// too long for an integer still order correctly.
int CompareDigits(std::string_view a, std::string_view b) {
  if (a.size() != b.size()) return a.size() < b.size() ? -1 : 1;
  int c = a.compare(b);
  return c < 0 ? -1 : c > 0 ? 1 : 0;
}

}  // namespace

int Util_CompareDotted(const char *a, const char *b) {
  std::string_view ra(a), rb(b);
  // A missing component, like the empty one after a trailing dot, is 0.
  while (!ra.empty() || !rb.empty()) {
    Component ca = ra.empty() ? Component{} : NextComponent(ra);
    Component cb = rb.empty() ? Component{} : NextComponent(rb);
    int c = CompareDigits(ca.digits, cb.digits);
    if (c != 0) return c;
    if (ca.tail.empty() != cb.tail.empty()) return ca.tail.empty() ? -1 : 1;
    c = ca.tail.compare(cb.tail);
    if (c != 0) return c < 0 ? -1 : 1;
  }
  return 0;
}
