// Recognition fuzz target. The input is a small set of marker files; they
// are mastered into an ISO 9660 image with Rock Ridge names in memory, and
// every recogniser runs on it through the medium-access calls, so the
// mutations land in the recognisers' parsers rather than in the image
// structures (the ISO 9660 target covers those).
//
// Input: entries separated by the byte 0x01. An entry's first line is a
// path below the root ("/" between components; a trailing "/" makes an empty
// directory), the rest of the entry is the file's content. The path
// "@volume" sets the volume identifier instead. Example:
//   \x01.disk/info\nUbuntu 20.04 amd64\x01isolinux/isolinux.cfg\ndefault x
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <map>
#include <string>
#include <string_view>
#include <vector>

#include "support/iso_builder.h"
#include "tvx_guess.h"
#include "tvx_iso9660.h"

namespace {

constexpr size_t kMaxInput = 256 * 1024;
constexpr size_t kMaxEntries = 64;
constexpr size_t kMaxComponent = 100;  // a Rock Ridge name must fit one record
constexpr size_t kMaxDepth = 6;

struct Node {
  bool isDir = true;
  std::string data;
  std::map<std::string, Node> children;
};

// Adds one entry; refuses paths that could not be mastered.
void AddEntry(Node *root, std::string_view path, std::string_view data) {
  bool dirOnly = !path.empty() && path.back() == '/';
  Node *node = root;
  size_t depth = 0;
  while (!path.empty()) {
    size_t slash = path.find('/');
    std::string_view name = path.substr(0, slash);
    path = slash == std::string_view::npos ? std::string_view() : path.substr(slash + 1);
    if (name.empty() || name == "." || name == ".." || name.size() > kMaxComponent ||
        name.find('\0') != std::string_view::npos || ++depth > kMaxDepth) {
      return;
    }
    if (!node->isDir) return;
    Node &child = node->children[std::string(name)];
    if (path.empty() && !dirOnly) {
      if (!child.children.empty()) return;
      child.isDir = false;
      child.data.assign(data);
      return;
    }
    node = &child;
  }
}

// Masters `dir` at `block` (already allocated) and returns its length.
uint32_t Master(tvxtest::IsoBuilder *iso, const Node &dir, uint32_t block, uint32_t parent,
                bool isRoot, int *serial) {
  std::vector<tvxtest::IsoRecord> records;
  for (const auto &[name, child] : dir.children) {
    std::string id = (child.isDir ? "D" : "F") + std::to_string(++*serial);
    if (!child.isDir) id += ".;1";
    tvxtest::IsoRecord rec{id, 0, 0, static_cast<uint8_t>(child.isDir ? 0x02 : 0),
                           tvxtest::susp::NM(name)};
    if (child.isDir) {
      // A record takes at most 255 bytes: eight fit one block.
      uint32_t blocks = static_cast<uint32_t>(child.children.size() + 2) / 8 + 1;
      rec.block = iso->NewBlocks(blocks);
      rec.size = Master(iso, child, rec.block, block, false, serial);
    } else {
      rec.size = static_cast<uint32_t>(child.data.size());
      uint32_t blocks = static_cast<uint32_t>((child.data.size() + 2047) / 2048);
      rec.block = blocks != 0 ? iso->NewBlocks(blocks) : 0;
      if (blocks != 0) iso->PutBlock(rec.block, child.data);
    }
    records.push_back(std::move(rec));
  }
  std::string dot = isRoot ? tvxtest::susp::SP() + tvxtest::susp::ER() : std::string();
  return iso->Dir(block, parent, records, dot);
}

std::vector<uint8_t> MasterInput(std::string_view input) {
  Node root;
  std::string volume = "FUZZ";
  size_t entries = 0;
  while (!input.empty() && entries++ < kMaxEntries) {
    size_t end = input.find('\x01');
    std::string_view entry = input.substr(0, end);
    input = end == std::string_view::npos ? std::string_view() : input.substr(end + 1);
    size_t nl = entry.find('\n');
    std::string_view path = entry.substr(0, nl);
    std::string_view data = nl == std::string_view::npos ? std::string_view() : entry.substr(nl + 1);
    if (path == "@volume") {
      volume.assign(data.substr(0, 32));
    } else {
      AddEntry(&root, path, data);
    }
  }

  tvxtest::IsoBuilder iso;
  int serial = 0;
  uint32_t rootBlocks = static_cast<uint32_t>(root.children.size() + 2) / 8 + 1;
  uint32_t rootBlock = iso.NewBlocks(rootBlocks);
  iso.SetRoot(rootBlock, Master(&iso, root, rootBlock, rootBlock, true, &serial));
  volume.resize(32, ' ');
  iso.Put(16 * 2048 + 40, volume);
  return iso.Bytes();
}

using Recogniser = Bool (*)(GuessMedium *, GuessResult *);

struct Entry {
  Recogniser call;
  // Whether a result filled beforehand must come back as recognised. The
  // others have exits that answer false outright, or are not checked here.
  bool keepsFilled;
};

// Guess_Guest's order, then the recogniser hosts call themselves.
constexpr Entry kRecognisers[] = {
    {Guess_WindowsNT, false}, {Guess_WindowsLegacy, false}, {Guess_WindowsVistaAndNewer, false},
    {Guess_RedHat, false},    {Guess_Mandriva, true},       {Guess_Debian, true},
    {Guess_SUSE, true},       {Guess_TurboLinux, true},     {Guess_Solaris, false},
    {Guess_NetWare, true},    {Guess_FreeBSD, false},       {Guess_Orka, true},
    {Guess_Orkai, false},     {Guess_Lumen, true},          {Guess_MacOS, false},
};

template <size_t N>
void CheckTerminated(const char (&field)[N]) {
  if (std::memchr(field, '\0', N) == nullptr) __builtin_trap();
}

// The contract every recogniser keeps, whatever the medium holds.
void Check(const GuessResult &r, Bool recognised) {
  if (recognised && r.guestOS == nullptr) __builtin_trap();
  if (r.version >= GUESS_VERSION_DUMMY_LAST) __builtin_trap();
  CheckTerminated(r.versionText);
  CheckTerminated(r.language);
  CheckTerminated(r.languageShort);
  CheckTerminated(r.languages);
  CheckTerminated(r.editions);
  CheckTerminated(r.displayName);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  if (size > kMaxInput) return 0;
  std::vector<uint8_t> image =
      MasterInput(std::string_view(reinterpret_cast<const char *>(data), size));
  Iso9660Image *iso = nullptr;
  if (tvxtest::OpenMemoryImage(image, 0, &iso) != ISO9660_OK) __builtin_trap();

  char path[] = "fuzz.iso";
  GuessMedium medium{GUESS_MEDIUM_ISO9660, path, iso, nullptr};
  for (const Entry &recogniser : kRecognisers) {
    GuessResult fresh{};
    Check(fresh, recogniser.call(&medium, &fresh));
    GuessResult filled{};
    filled.guestOS = "winXPPro";
    Bool kept = recogniser.call(&medium, &filled);
    if (recogniser.keepsFilled && !kept) __builtin_trap();
    Check(filled, kept);
  }
  Iso9660_Close(iso);
  return 0;
}
