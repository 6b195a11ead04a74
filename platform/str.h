// Bounded string operations. Every text returned is malloc'd (free with free).
#pragma once

#include "tvx_base.h"

#include <cstdarg>
#include <cstddef>
#include <cstdint>

// Str_Snprintf writes at most `size` bytes including the NUL and returns the
// length written, or -1 when the output was cut (the buffer then holds the cut,
// terminated text).
int Str_Snprintf(char *buf, size_t size, const char *fmt, ...) TVX_PRINTF(3, 4);
// Str_Asprintf returns a new text, or null on failure; `out_length` (optional)
// receives its length.
char *Str_Asprintf(size_t *out_length, const char *fmt, ...) TVX_PRINTF(2, 3);
char *Str_Vasprintf(size_t *out_length, const char *fmt, va_list args) TVX_PRINTF(2, 0);
// Str_SafeAsprintf is Str_Asprintf that never returns null.
char *Str_SafeAsprintf(size_t *out_length, const char *fmt, ...) TVX_PRINTF(2, 3);
// Str_ToUpper / Str_ToLower convert ASCII letters in place and return `s`.
char *Str_ToUpper(char *s);
char *Str_ToLower(char *s);

// StrUtil_GetNextToken returns, as a new text, the next token of `str` at or
// after *index, where tokens are separated by runs of any of the characters
// of `delimiters` (leading delimiters are skipped, so empty tokens never come
// back). *index advances past the token and one delimiter. Null when no token
// is left.
char *StrUtil_GetNextToken(unsigned int *index, const char *str, const char *delimiters);
// StrUtil_GetNextIntToken reads the next token as a whole signed 32-bit decimal
// number (an optional sign, then digits, nothing else). FALSE when there is no
// token or it is not such a number; *index still advances past the token.
Bool StrUtil_GetNextIntToken(int32_t *out, unsigned int *index, const char *str,
                             const char *delimiters);
Bool StrUtil_StartsWith(const char *s, const char *prefix);
Bool StrUtil_EndsWith(const char *s, const char *suffix);
Bool StrUtil_CaselessStartsWith(const char *s, const char *prefix);
// StrUtil_DecimalStrToUint reads decimal digits at *str into *out and advances
// *str past them. FALSE (and *str unchanged) when no digit is there or the
// number does not fit 32 bits.
Bool StrUtil_DecimalStrToUint(unsigned int *out, const char **str);
// StrUtil_StrToInt / StrToUint convert a whole text (optional leading blanks,
// optional sign for Int, decimal or 0x-hex digits, nothing after) to a 32-bit
// number. FALSE when the text is not such a number or does not fit.
Bool StrUtil_StrToInt(int32_t *out, const char *str);
Bool StrUtil_StrToUint(uint32_t *out, const char *str);
