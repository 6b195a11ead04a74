// The isolinux boot configuration of an install medium: finding the
// installer's kernel, RAM disk and arguments in it, and writing the one-entry
// configuration of the unattended boot tree.
//
// The format is line based: "label NAME" starts an entry (only at the first
// character of a line), and within an entry "kernel PATH" and "append ARGS"
// give the kernel and its arguments, one of which, "initrd=PATH", names the
// RAM disk. Keywords are caseless. Menus, includes and defaults are ignored:
// the installer's entry is the first complete one on every medium we know.
#include <cstring>
#include <string>
#include <string_view>

#include "platform/ascii.h"
#include "lib/guestInstall/autoinstall_linux_media_internal.h"

namespace tvx::autoinstall {
namespace {

constexpr size_t kMaxAppend = 511;

constexpr bool IsBlank(char c) { return c == ' ' || c == '\t'; }

std::string_view TrimBlanks(std::string_view s) {
  while (!s.empty() && IsBlank(s.front())) s.remove_prefix(1);
  while (!s.empty() && IsBlank(s.back())) s.remove_suffix(1);
  return s;
}

// KeywordValue: `line` is `keyword`, a blank and a value that is not empty.
bool KeywordValue(std::string_view line, std::string_view keyword, std::string_view *out) {
  if (line.size() <= keyword.size() + 1 || !ascii::StartsWith(line, keyword) ||
      !IsBlank(line[keyword.size()])) {
    return false;
  }
  *out = TrimBlanks(line.substr(keyword.size() + 1));
  return !out->empty();
}

// ForEachArgument calls `fn` for every blank-separated argument of `text`.
template <typename Fn>
void ForEachArgument(std::string_view text, Fn fn) {
  size_t i = 0;
  while (i < text.size()) {
    while (i < text.size() && IsBlank(text[i])) ++i;
    size_t start = i;
    while (i < text.size() && !IsBlank(text[i])) ++i;
    if (i > start) fn(text.substr(start, i - start));
  }
}

}  // namespace

bool parseIsolinuxConfig(std::string_view text, BootEntry *out) {
  BootEntry entry;
  bool inEntry = false, haveKernel = false, haveAppend = false;
  auto complete = [&] { return haveKernel && haveAppend && !entry.initrd.empty(); };
  while (!text.empty()) {
    size_t nl = text.find('\n');
    std::string_view line = text.substr(0, nl);
    text.remove_prefix(nl == std::string_view::npos ? text.size() : nl + 1);
    while (!line.empty() && line.back() == '\r') line.remove_suffix(1);

    std::string_view value;
    if (KeywordValue(line, "label", &value)) {
      if (complete()) break;
      // An entry that never became complete leaves nothing behind.
      entry = BootEntry();
      haveKernel = haveAppend = false;
      inEntry = true;
      continue;
    }
    if (!inEntry) continue;
    std::string_view body = TrimBlanks(line);
    if (KeywordValue(body, "kernel", &value)) {
      entry.kernel.assign(value);
      haveKernel = true;
    } else if (KeywordValue(body, "append", &value)) {
      // A later append line of the same entry replaces the earlier one, as
      // the boot loader itself does.
      entry.append.clear();
      ForEachArgument(value, [&](std::string_view arg) {
        if (ascii::StartsWith(arg, "initrd=")) {
          entry.initrd.assign(arg.substr(7));
        } else if (entry.append.size() + arg.size() + 1 <= kMaxAppend) {
          entry.append.append(arg).push_back(' ');
        }
      });
      haveAppend = true;
      if (complete()) break;
    }
  }
  if (!complete()) return false;
  *out = std::move(entry);
  return true;
}

void removeAskMethod(std::string *append) {
  std::string kept;
  ForEachArgument(*append, [&](std::string_view arg) {
    if (arg != "askmethod") kept.append(arg).push_back(' ');
  });
  *append = std::move(kept);
}

bool NeedsLdlinux(std::string_view isolinuxBin) {
  // The banner, "ISOLINUX 6.04 20200816", sits in the loader's first sector.
  constexpr std::string_view kBanner = "ISOLINUX ";
  for (size_t at = isolinuxBin.find(kBanner); at != std::string_view::npos;
       at = isolinuxBin.find(kBanner, at + 1)) {
    std::string_view rest = isolinuxBin.substr(at + kBanner.size());
    unsigned major = 0;
    size_t digits = 0;
    while (digits < rest.size() && digits < 3 && ascii::IsDigit(rest[digits])) {
      major = major * 10 + static_cast<unsigned>(rest[digits] - '0');
      ++digits;
    }
    if (digits > 0 && digits < rest.size() && rest[digits] == '.') return major >= 5;
  }
  return false;
}

bool BootConfigText(const std::string &kernelBase, const std::string &initrdBase,
                    const std::string &append, const char *bootArguments, std::string *out) {
  std::string text = "default linux\nprompt 0\ntimeout 1\n\nlabel linux\n\tkernel ";
  text.append(kernelBase).append("\n\tappend initrd=").append(initrdBase).push_back(' ');
  text.append(append).push_back(' ');
  text.append(bootArguments != nullptr ? bootArguments : "").push_back('\n');
  if (text.size() > kMaxConfigBytes) return false;
  *out = std::move(text);
  return true;
}

}  // namespace tvx::autoinstall
