// A growable byte buffer. Growth that cannot be satisfied stops the process,
// so the Bool results are always TRUE; they exist for call sites that check.
#pragma once

#include "tvx_base.h"

#include <cstddef>

struct DynBuf {
  char *data;
  size_t size;       // bytes in use
  size_t allocated;  // bytes allocated
};

void DynBuf_Init(DynBuf *b);
void DynBuf_Destroy(DynBuf *b);
// DynBuf_Enlarge makes room for at least `min_size` bytes in all.
Bool DynBuf_Enlarge(DynBuf *b, size_t min_size);
Bool DynBuf_Append(DynBuf *b, const void *data, size_t size);
Bool DynBuf_Strcat(DynBuf *b, const char *text);  // appends text without NUL
Bool DynBuf_AppendByte(DynBuf *b, char c);
// DynBuf_Detach hands the bytes (malloc'd, free with free) to the caller and
// leaves the buffer empty. Never null: an empty buffer yields a 1-byte block.
void *DynBuf_Detach(DynBuf *b);
static inline char *DynBuf_Get(DynBuf *b) { return b->data; }
static inline size_t DynBuf_GetSize(const DynBuf *b) { return b->size; }
