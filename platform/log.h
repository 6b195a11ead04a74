// Diagnostics and process stop. Every message goes to the sink installed with
// Tvx_SetLogSink (tvx_log.h); Panic also aborts.
#pragma once

#include "tvx_base.h"
#include "tvx_log.h"

#include <cstdarg>

void Log(const char *fmt, ...) TVX_PRINTF(1, 2);
void Warning(const char *fmt, ...) TVX_PRINTF(1, 2);
// Log_Level logs at a numeric detail level (0 most important). Levels above
// TVX_LOG_VERBOSE are delivered as TVX_LOG_VERBOSE.
void Log_Level(int level, const char *fmt, ...) TVX_PRINTF(2, 3);
void LogV(TvxLogLevel level, const char *fmt, va_list args) TVX_PRINTF(2, 0);
// Panic logs the message at TVX_LOG_PANIC and aborts the process.
[[noreturn]] void Panic(const char *fmt, ...) TVX_PRINTF(1, 2);

// NOT_REACHED stops the process with "NOT_REACHED <file>:<line>\n". `file` is
// the source path the caller names (e.g. "lib/guessGuest/guess").
#define NOT_REACHED_AT(file) Panic("NOT_REACHED %s:%d\n", (file), __LINE__)
