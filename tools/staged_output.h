// StagedOutput: "stage then commit" for commands that write several files
// into a user's output directory. The files are prepared in a fresh staging
// directory beside the output directory; only when all of them are ready does
// Commit move them in. A command that fails (or returns early) leaves nothing
// new in the output directory: the destructor removes the staging directory
// with whatever it holds.
//
//   StagedOutput stage(outDir);
//   if (!stage.Open(&err)) ...                  // creates the staging dir
//   Prepare(stage.dir() + "/winnt.sif", ...);   // write everything there
//   if (!stage.Commit(&err)) ...                // moves each entry into outDir
//   for (const std::string &p : stage.committed()) ...   // paths in outDir
//
// Commit creates the output directory (with its parents) when it is missing
// and renames each staged entry into it. A rename replaces a file or a
// symbolic link of the same name without following it (nothing is written
// through a link planted there). A staged directory is merged into an
// existing directory of the same name, entry by entry; an entry that would
// replace a directory with a file, or a file or link with a directory, is
// refused before anything moves. The staging directory sits beside the output
// directory, so the renames stay on one file system.
#pragma once

#include <string>
#include <vector>

namespace tvxcli {

class StagedOutput {
 public:
  explicit StagedOutput(std::string outDir);
  ~StagedOutput();
  StagedOutput(const StagedOutput &) = delete;
  StagedOutput &operator=(const StagedOutput &) = delete;

  // Open creates the staging directory (and the parents of the output
  // directory when they are missing; they are removed again, when empty, if
  // nothing is committed). False with a message in `err`.
  bool Open(std::string *err);
  // dir is the staging directory: write the files here.
  const std::string &dir() const { return stage_; }
  // Commit moves every staged entry into the output directory. False with a
  // message in `err` when an entry cannot go there; then nothing has moved.
  bool Commit(std::string *err);
  // committed lists the output paths of the top-level entries moved in.
  const std::vector<std::string> &committed() const { return committed_; }

 private:
  std::string out_;
  std::string stage_;
  std::string parent_;   // the output directory's parent
  std::string created_;  // the outermost of its parents that Open made, or ""
  bool madeOut_ = false;  // Commit made the output directory
  std::vector<std::string> committed_;
};

}  // namespace tvxcli
