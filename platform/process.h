// Running an external program without a shell: the program gets exactly the
// argument vector it is given, so no character of an argument (quotes,
// blanks, "$", backticks) is ever interpreted.
#pragma once

// Process_Run starts argv[0] (a path, or a bare name looked up in PATH) with
// the arguments argv[0..] (ending in a null pointer), with standard input
// from /dev/null and standard output and error inherited, and waits for it.
// Returns its exit status (0..255), or -1 when it could not be started or was
// ended by a signal; `out_errno` (optional) then holds the reason (errno of
// the start, or EINTR for a signal).
int Process_Run(const char *const argv[], int *out_errno = nullptr);
