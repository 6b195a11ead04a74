/*
 * tvx_base.h -- conventions shared by every public header of libtvxguest.
 *
 * 1. Plain C. Every public header compiles as C11 and as C++; functions have
 *    C linkage and are exported with TVX_EXPORT. Nothing else is visible.
 * 2. Bool is one byte: TRUE (1) or FALSE (0). Test it as a truth value, never
 *    compare it with TRUE.
 * 3. Failures are returned, never thrown: a FALSE Bool, a NULL pointer or a
 *    small status code that the function's comment documents. Detail goes to
 *    the log sink (tvx_log.h). No C++ exception ever crosses this boundary.
 * 4. A text (char *) that a function returns or stores through an out_*
 *    parameter is allocated with malloc() and belongs to the caller, who frees
 *    it with free(), unless the comment says it is a constant of the library.
 * 5. Handles are opaque pointers; each has one open/create call and one
 *    close/free call. Closing NULL is harmless where the comment says so.
 * 6. Pointer arguments must not be NULL unless the comment says "optional".
 * 7. Out parameters are named out_* (or described as "out") and come after
 *    the handle or context argument.
 * 8. Calls are reentrant unless the comment names process-wide state.
 */
#ifndef TVX_BASE_H
#define TVX_BASE_H

#include <stddef.h>
#include <stdint.h>

#ifdef __cplusplus
#define TVX_BEGIN_DECLS extern "C" {
#define TVX_END_DECLS }
#else
#define TVX_BEGIN_DECLS
#define TVX_END_DECLS
#endif

#if defined(TVX_BUILDING_LIBRARY)
#define TVX_EXPORT __attribute__((visibility("default")))
#else
#define TVX_EXPORT
#endif

#if defined(__GNUC__)
#define TVX_PRINTF(fmt, args) __attribute__((format(printf, fmt, args)))
#else
#define TVX_PRINTF(fmt, args)
#endif

typedef unsigned char Bool;
#ifndef TRUE
#define TRUE 1
#endif
#ifndef FALSE
#define FALSE 0
#endif

TVX_BEGIN_DECLS

/* Tvx_GetVersion returns the library's version text, e.g. "0.1.0": a constant
 * of the library, never freed. */
TVX_EXPORT const char *Tvx_GetVersion(void);

TVX_END_DECLS

#endif /* TVX_BASE_H */
