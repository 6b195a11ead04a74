// FreeBSD and NetWare install media.
//
// FreeBSD: the kernel's ELF machine gives the architecture, and the first
// line of RELNOTES.TXT ("FreeBSD 13.2-RELEASE Release Notes") the release.
// NetWare: the release is named by a directory at the root.

#include <cstdint>
#include <cstring>

#include "lib/guessGuest/guess_internal.h"
#include "tvx_guess.h"

namespace {

// Where FreeBSD media keep the kernel, by generation. An ISO 9660 reader
// without Rock Ridge shows a name without extension with its dot.
constexpr const char *kKernelPaths[] = {"/kernel", "/boot/kernel/kernel",
                                        "/boot/kernel/kernel."};

struct FreeBsdRow {
  const char *release;  // contained in the first line of RELNOTES.TXT
  // Indexed by GuessElfArch; null keeps the generic identifier.
  const char *byArch[4];
};

// 64-bit Arm support begins with 13, so older Arm media are installed as 13;
// there is no 32-bit x86 identifier for 14.
constexpr FreeBsdRow kGeneric = {"", {nullptr, "freeBSD", "freeBSD-64", "arm-freeBSD13-64"}};
constexpr FreeBsdRow kReleases[] = {
    {"FreeBSD 14.", {nullptr, nullptr, "freeBSD14-64", "arm-freeBSD14-64"}},
    {"FreeBSD 13.", {nullptr, "freeBSD13", "freeBSD13-64", "arm-freeBSD13-64"}},
    {"FreeBSD 12.", {nullptr, "freeBSD12", "freeBSD12-64", nullptr}},
    {"FreeBSD 11.", {nullptr, "freeBSD11", "freeBSD11-64", nullptr}},
};

tvx::guess::Text ReadKernel(GuessMedium *medium, uint64_t *size) {
  for (const char *path : kKernelPaths) {
    tvx::guess::Text kernel = tvx::guess::ReadText(medium, path, size);
    if (kernel) return kernel;
  }
  return nullptr;
}

// The release row that the first line of RELNOTES.TXT names, or null.
const FreeBsdRow *ReleaseRow(GuessMedium *medium) {
  tvx::guess::Text notes = tvx::guess::ReadText(medium, "RELNOTES.TXT");
  if (!notes) return nullptr;
  if (char *lineEnd = std::strchr(notes.get(), '\n')) *lineEnd = '\0';
  for (const FreeBsdRow &row : kReleases) {
    if (tvx::guess::Contains(notes.get(), row.release)) return &row;
  }
  return nullptr;
}

struct NetWareRow {
  const char *entry;
  const char *guestOS;
};

constexpr NetWareRow kNetWareRows[] = {
    {"netware6", "netware6"},
    {"nw65os", "netware6"},
    {"nw51", "netware5"},
};

const char *NetWareId(const char *name) {
  for (const NetWareRow &row : kNetWareRows) {
    if (tvx::ascii::Equal(name, row.entry)) return row.guestOS;
  }
  return nullptr;
}

}  // namespace

extern "C" TVX_EXPORT Bool Guess_FreeBSD(GuessMedium *medium, GuessResult *result) {
  uint64_t size = 0;
  tvx::guess::Text kernel = ReadKernel(medium, &size);
  if (!kernel) return FALSE;
  GuessElfArch arch = Guess_ELF_Arch(kernel.get(), static_cast<size_t>(size));
  kernel.reset();
  if (arch > GUESS_ELF_ARCH_ARM64) arch = GUESS_ELF_ARCH_UNKNOWN;

  if (arch != GUESS_ELF_ARCH_UNKNOWN) {
    result->guestOS = kGeneric.byArch[arch];
    const FreeBsdRow *release = ReleaseRow(medium);
    if (release != nullptr && release->byArch[arch] != nullptr) {
      result->guestOS = release->byArch[arch];
    }
  }
  result->version = GUESS_VERSION_UNKNOWN;
  return arch != GUESS_ELF_ARCH_UNKNOWN ? TRUE : FALSE;
}

extern "C" TVX_EXPORT Bool Guess_NetWare(GuessMedium *medium, GuessResult *result) {
  const char *id = nullptr;
  {
    tvx::guess::Dir root(medium, "/");
    if (!root) return FALSE;
    for (const char *name; id == nullptr && (name = root.Next()) != nullptr;) id = NetWareId(name);
  }
  if (id == nullptr) return tvx::guess::NotRecognised(result);
  return tvx::guess::Recognised(result, id, GUESS_VERSION_UNKNOWN);
}
