// Libraries that most processes never need are opened with dlopen on their
// first use instead of being linked: linking libxml2 and ICU costs every
// process about 10 ms of relocations at start-up, libcurl as much again, and
// a `detect` needs none of them. Their headers still give the types; every
// call goes through a table of entry points that a loader fills once.
#pragma once

#include <dlfcn.h>

namespace tvx {

// DynLib opens one shared object by its soname. The handle is never closed:
// the libraries loaded this way keep global state for the life of the
// process.
class DynLib {
 public:
  explicit DynLib(const char *soname) : handle_(dlopen(soname, RTLD_NOW | RTLD_LOCAL)) {}

  bool Loaded() const { return handle_ != nullptr; }

  // Resolve sets *out to the entry point called `name` and says whether it
  // exists; `Fn` is the pointer type the header declares for it.
  template <typename Fn>
  bool Resolve(const char *name, Fn *out) const {
    *out = handle_ == nullptr ? nullptr : reinterpret_cast<Fn>(dlsym(handle_, name));
    return *out != nullptr;
  }

 private:
  void *handle_;
};

// LoadOnce runs `fill` on a table of entry points the first time it is
// called (from any thread; C++ makes the static's start-up safe) and then
// hands out that table, or null when `fill` failed. Each caller passes its
// own lambda, so each gets its own table.
template <typename Api, typename Fill>
const Api *LoadOnce(Fill fill) {
  static Api api;
  static const bool ok = fill(&api);
  return ok ? &api : nullptr;
}

}  // namespace tvx
