/*
 * tvx_log.h -- where the library's diagnostics go.
 *
 * The library writes diagnostic lines (what failed and why) through one sink.
 * By default the sink discards them: a library loaded into a host process
 * must not write to the host's standard streams. A host that wants them
 * installs its own sink; the command-line tool's -v installs one that prints
 * to standard error.
 *
 * A sink may receive secrets. Some diagnostics quote the user's answers as
 * they were given, among them a line that names the administrator password
 * when it cannot be written into an answer file. Treat the sink's output as
 * confidential: do not forward it to shared logs without filtering.
 */
#ifndef TVX_LOG_H
#define TVX_LOG_H

#include "tvx_base.h"

TVX_BEGIN_DECLS

typedef enum TvxLogLevel {
  TVX_LOG_PANIC = 0,   /* the process stops right after this line */
  TVX_LOG_WARNING = 1,
  TVX_LOG_INFO = 2,    /* ordinary diagnostics (the bulk of the lines) */
  TVX_LOG_VERBOSE = 3, /* detail lines */
} TvxLogLevel;

/* TvxLogSink receives one formatted message. `text` is the message exactly as
 * the library formatted it (most end in "\n"; a few, documented by their
 * callers, do not). It is valid only during the call. The sink may be called
 * from any thread that calls into the library. */
typedef void (*TvxLogSink)(TvxLogLevel level, const char *text, void *ctx);

/* Tvx_SetLogSink installs `sink` (optional: NULL restores the default, which
 * discards) with the context pointer handed to every call. Process-wide; set
 * it before calling other functions from several threads. */
TVX_EXPORT void Tvx_SetLogSink(TvxLogSink sink, void *ctx);

TVX_END_DECLS

#endif /* TVX_LOG_H */
