// Shared by the `unattended` subcommands: recognising the image and naming
// the answer-limit family of a guest.
#pragma once

#include <string>
#include <vector>

#include "tvx_guess.h"

namespace tvxcli {

inline constexpr const char *kUnattendedGroup = "unattended";

// RecogniseImage runs Guess_Guest on `image` and returns its result: 0
// recognised, 1 opened but not recognised, 2 not an image (an error line for
// `cmd` is printed on standard error then).
int RecogniseImage(const char *cmd, const std::string &image, GuessResult *out);

// RecogniseForAnswers recognises `image` for a command that writes answer
// files: -1 when a guest was recognised, else the exit status after telling
// why (a JSON object with `json`, else a line on standard error): 1 nothing
// recognised, 2 not an image. On -1, `supported` says whether unattended
// install is offered for the guest (a note on standard error when it is not,
// unless `json`).
int RecogniseForAnswers(const char *cmd, const std::string &image, bool json, GuessResult *out,
                        bool *supported);

// GuestFamily gives "windows" for Windows guest identifiers and "linux" for
// every other, as the host picks the family of its answer limits.
const char *GuestFamily(const GuessResult &guess);

// GuestLabel: "centos7-64 (GUESS_VERSION_CENTOS_7)", or "not recognised".
std::string GuestLabel(const GuessResult &guess);

// What a typed answer is, for CheckAnswer.
enum class AnswerKind { kPassword, kShortName, kName, kOther };

// CheckAnswer refuses an answer the user typed before anything is written:
// invalid UTF-8 or a control character (a line end could add a key or a
// line to an answer file), a text longer than the guest's limit
// (AutoInstall_GetInstallConfigInfo), one the library's validator refuses
// (its message) and, when `forIni` (the text goes into an INI file such as
// winnt.sif), a double quote or a semicolon, which the INI format cannot
// carry inside a value. Returns "" when the text is fine, else a message that
// names `label` and the character, e.g. "--password holds a carriage return".
std::string CheckAnswer(const GuessResult &guess, const char *label, const std::string &text,
                        AnswerKind kind, bool forIni);

// ReadFirstLine reads the first line of a file (a password kept out of the
// command line), without its line end; false when the file cannot be read.
bool ReadFirstLine(const std::string &path, std::string *out);

// AnswerReport is what an answer-file command tells at its end.
struct AnswerReport {
  const char *cmd;               // "unattended linux"
  const std::string *image;
  const GuessResult *guess;
  bool ok;
  bool supported;
  const bool *imageListed;       // optional: Windows commands say it
  const std::vector<std::string> *files;  // what was written, in order
  const std::vector<std::string> *log;    // the library's reasons
  const char *failure;           // "the answer files were not written"
};

// ReportAnswers prints the report (one JSON object with `json`, else lines
// for people, the failure and its reasons on standard error) and returns the
// exit status: 0 done, 1 failed.
int ReportAnswers(const AnswerReport &r, bool json);

}  // namespace tvxcli
