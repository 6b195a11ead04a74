#include "platform/dynbuf.h"

#include <cstdlib>
#include <cstring>

#include "platform/log.h"

void DynBuf_Init(DynBuf *b) {
  b->data = nullptr;
  b->size = 0;
  b->allocated = 0;
}

void DynBuf_Destroy(DynBuf *b) {
  std::free(b->data);
  DynBuf_Init(b);
}

Bool DynBuf_Enlarge(DynBuf *b, size_t min_size) {
  if (min_size <= b->allocated) return TRUE;
  // Doubling keeps appends amortised linear; small buffers start at 128.
  size_t want = b->allocated < 64 ? 128 : b->allocated * 2;
  if (want < b->allocated || want < min_size) want = min_size;
  char *p = static_cast<char *>(std::realloc(b->data, want));
  if (p == nullptr) Panic("DynBuf_Enlarge: cannot allocate %zu bytes\n", want);
  b->data = p;
  b->allocated = want;
  return TRUE;
}

Bool DynBuf_Append(DynBuf *b, const void *data, size_t size) {
  if (size == 0) return TRUE;
  if (size > SIZE_MAX - b->size) Panic("DynBuf_Append: size overflow\n");
  const char *src = static_cast<const char *>(data);
  // Appending part of the buffer to itself must survive the reallocation.
  if (b->data != nullptr && src >= b->data && src < b->data + b->allocated) {
    size_t offset = static_cast<size_t>(src - b->data);
    DynBuf_Enlarge(b, b->size + size);
    src = b->data + offset;
  } else {
    DynBuf_Enlarge(b, b->size + size);
  }
  std::memmove(b->data + b->size, src, size);
  b->size += size;
  return TRUE;
}

Bool DynBuf_Strcat(DynBuf *b, const char *text) { return DynBuf_Append(b, text, std::strlen(text)); }

Bool DynBuf_AppendByte(DynBuf *b, char c) { return DynBuf_Append(b, &c, 1); }

void *DynBuf_Detach(DynBuf *b) {
  void *p = b->data;
  if (p == nullptr) {
    p = std::malloc(1);
    if (p == nullptr) Panic("DynBuf_Detach: out of memory\n");
    static_cast<char *>(p)[0] = '\0';
  }
  DynBuf_Init(b);
  return p;
}
