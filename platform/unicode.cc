// Conversion through glibc iconv. The code-page choice per encoding number:
// Windows setup of the NT generation reads its answer file in the system's
// ANSI code page, so each number maps to the ANSI code page Windows uses for
// that language (932 Japanese, 936 Simplified Chinese, 949 Korean,
// 950 Traditional Chinese, 1251 Cyrillic, 1252 Western) rather than to the
// ISO or EUC standard sets, which differ from them in a few hundred
// characters.
#include "platform/unicode.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <string>

#include <iconv.h>

namespace {

struct EncodingRow {
  StringEncoding id;
  const char *name;       // shown in messages
  const char *iconvName;  // what glibc iconv calls it
};

constexpr EncodingRow kEncodings[] = {
    {STRING_ENCODING_UTF8, "UTF-8", "UTF-8"},
    {STRING_ENCODING_WINDOWS_950, "windows-950", "CP950"},
    {STRING_ENCODING_WINDOWS_936, "windows-936", "CP936"},
    {STRING_ENCODING_WINDOWS_932, "windows-932", "CP932"},
    {STRING_ENCODING_WINDOWS_1251, "windows-1251", "CP1251"},
    {STRING_ENCODING_WINDOWS_1252, "windows-1252", "CP1252"},
    {STRING_ENCODING_WINDOWS_949, "windows-949", "CP949"},
};

const EncodingRow *FindEncoding(StringEncoding id) {
  for (const EncodingRow &row : kEncodings) {
    if (row.id == id) return &row;
  }
  return nullptr;
}

class Iconv {
 public:
  Iconv(const char *to, const char *from) : cd_(iconv_open(to, from)) {}
  ~Iconv() {
    if (ok()) iconv_close(cd_);
  }
  Iconv(const Iconv &) = delete;
  Iconv &operator=(const Iconv &) = delete;
  bool ok() const { return cd_ != reinterpret_cast<iconv_t>(-1); }
  iconv_t get() const { return cd_; }

 private:
  iconv_t cd_;
};

// Convert runs the whole input through `cd`, growing the output as needed.
// Any EILSEQ (invalid input or a character the target lacks) or EINVAL
// (input ends inside a sequence) fails the conversion.
bool Convert(iconv_t cd, const char *in, size_t inLen, std::string *out) {
  std::string buf(inLen * 2 + 16, '\0');
  char *inPtr = const_cast<char *>(in);
  size_t inLeft = inLen;
  size_t used = 0;
  bool flushing = false;
  for (;;) {
    char *outPtr = buf.data() + used;
    size_t outLeft = buf.size() - used;
    size_t rc = flushing ? iconv(cd, nullptr, nullptr, &outPtr, &outLeft)
                         : iconv(cd, &inPtr, &inLeft, &outPtr, &outLeft);
    used = buf.size() - outLeft;
    if (rc != static_cast<size_t>(-1)) {
      if (flushing) break;
      flushing = true;  // let stateful targets write their closing shift
      continue;
    }
    if (errno != E2BIG) return false;
    buf.resize(buf.size() * 2);
  }
  buf.resize(used);
  *out = std::move(buf);
  return true;
}

}  // namespace

char *Unicode_GetAllocBytes(const char *str, StringEncoding encoding) {
  if (str == nullptr) return nullptr;
  const EncodingRow *row = FindEncoding(encoding);
  if (row == nullptr) return nullptr;
  Iconv cd(row->iconvName, "UTF-8");
  if (!cd.ok()) return nullptr;
  std::string out;
  // Validating UTF-8 → UTF-8 goes through iconv too, so an invalid input is
  // refused for every target alike.
  if (!Convert(cd.get(), str, std::strlen(str), &out)) return nullptr;
  // Input without NULs cannot produce one in these ASCII-compatible targets,
  // so the result stays one C text.
  char *result = static_cast<char *>(std::malloc(out.size() + 1));
  if (result == nullptr) return nullptr;
  std::memcpy(result, out.data(), out.size());
  result[out.size()] = '\0';
  return result;
}

const char *Unicode_EncodingEnumToName(StringEncoding encoding) {
  const EncodingRow *row = FindEncoding(encoding);
  return row != nullptr ? row->name : "unknown";
}
