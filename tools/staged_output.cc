#include "staged_output.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>

namespace tvxcli {
namespace {

namespace fs = std::filesystem;

std::vector<std::string> Names(const std::string &dir) {
  std::vector<std::string> names;
  if (DIR *d = ::opendir(dir.c_str())) {
    while (dirent *e = ::readdir(d)) {
      std::string n = e->d_name;
      if (n != "." && n != "..") names.push_back(n);
    }
    ::closedir(d);
  }
  return names;
}

bool IsRealDir(const std::string &path, bool *exists) {
  struct stat st;
  *exists = ::lstat(path.c_str(), &st) == 0;
  return *exists && S_ISDIR(st.st_mode);
}

// Check walks the staged tree against the output tree before anything moves.
bool Check(const std::string &from, const std::string &to, std::string *err) {
  for (const std::string &n : Names(from)) {
    bool srcExists, dstExists;
    bool srcDir = IsRealDir(from + "/" + n, &srcExists);
    bool dstDir = IsRealDir(to + "/" + n, &dstExists);
    if (dstExists && srcDir != dstDir) {
      *err = to + "/" + n + ": " +
             (dstDir ? "a directory is in the way" : "is in the way of a directory");
      return false;
    }
    if (srcDir && dstDir && !Check(from + "/" + n, to + "/" + n, err)) return false;
  }
  return true;
}

bool Move(const std::string &from, const std::string &to, std::string *err) {
  for (const std::string &n : Names(from)) {
    bool exists;
    std::string src = from + "/" + n, dst = to + "/" + n;
    if (IsRealDir(src, &exists) && IsRealDir(dst, &exists)) {
      if (!Move(src, dst, err)) return false;
      continue;
    }
    if (::rename(src.c_str(), dst.c_str()) != 0) {
      *err = dst + ": " + std::strerror(errno);
      return false;
    }
  }
  return true;
}

}  // namespace

StagedOutput::StagedOutput(std::string outDir) : out_(std::move(outDir)) {
  while (out_.size() > 1 && out_.back() == '/') out_.pop_back();
}

StagedOutput::~StagedOutput() {
  if (stage_.empty()) return;
  std::error_code ec;
  fs::remove_all(stage_, ec);  // never follows links out of the tree
  if (!committed_.empty()) return;
  // Nothing moved in: what Open and Commit made goes again, innermost first,
  // as long as it is empty (fs::remove leaves a directory that is not).
  if (madeOut_) fs::remove(out_, ec);
  if (created_.empty()) return;
  for (fs::path p = parent_; fs::remove(p, ec) && p != created_; p = p.parent_path()) {
  }
}

bool StagedOutput::Open(std::string *err) {
  fs::path out(out_);
  fs::path parent = out.has_parent_path() ? out.parent_path() : fs::path(".");
  std::error_code ec;
  fs::path missing;
  for (fs::path p = parent; !p.empty() && !fs::exists(fs::symlink_status(p, ec));
       p = p.parent_path()) {
    missing = p;
  }
  fs::create_directories(parent, ec);
  if (ec) {
    *err = parent.string() + ": " + ec.message();
    return false;
  }
  std::string tmpl = (parent / ("." + out.filename().string() + ".staging-XXXXXX")).string();
  if (::mkdtemp(tmpl.data()) == nullptr) {
    *err = parent.string() + ": " + std::strerror(errno);
    return false;
  }
  stage_ = tmpl;
  parent_ = parent.string();
  created_ = missing.string();
  return true;
}

bool StagedOutput::Commit(std::string *err) {
  bool exists;
  if (!IsRealDir(out_, &exists)) {
    if (exists || ::mkdir(out_.c_str(), 0755) != 0) {
      *err = out_ + ": " + (exists ? "not a directory" : std::strerror(errno));
      return false;
    }
    madeOut_ = true;
  }
  std::vector<std::string> names = Names(stage_);
  if (!Check(stage_, out_, err) || !Move(stage_, out_, err)) return false;
  committed_.clear();
  for (const std::string &n : names) committed_.push_back(out_ + "/" + n);
  return true;
}

}  // namespace tvxcli
