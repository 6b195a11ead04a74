// Allocation that never fails (it stops the process on exhaustion) and dotted
// version comparison.
#pragma once

#include <cstddef>

// Each returns memory from malloc (free with free) and never returns null:
// exhaustion ends the process through Panic. Malloc0 of 0 bytes returns a
// valid one-byte block. Strdup0/Strndup0 of null return null.
void *UtilSafeMalloc0(size_t size);
void *UtilSafeCalloc0(size_t count, size_t size);
char *UtilSafeStrdup0(const char *s);
char *UtilSafeStrndup0(const char *s, size_t n);

// Util_CompareDotted compares two dotted decimal version texts ("14.04.2")
// number by number and returns <0, 0 or >0. A missing component counts as 0
// ("8" == "8.0"). A component's numeric prefix is compared first; when equal,
// a non-numeric tail ("2-desktop") sorts after no tail, and two tails compare
// as text.
int Util_CompareDotted(const char *a, const char *b);
