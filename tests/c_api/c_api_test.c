/* Compiles every public header as C11 and calls through each, so a C host
 * can build against them. Returns 0 when every phase passes. */
#include "tvx_all_headers.h"

#include <stdio.h>
#include <stdlib.h>
#include <string.h>

static int failures = 0;
static const char *phase = "";

#define CHECK(cond)                                              \
  do {                                                           \
    if (!(cond)) {                                               \
      fprintf(stderr, "%s: check failed: %s\n", phase, #cond);   \
      failures++;                                                \
    }                                                            \
  } while (0)

static int sink_calls = 0;
static void CountingSink(TvxLogLevel level, const char *text, void *ctx) {
  (void)level;
  (void)text;
  (void)ctx;
  sink_calls++;
}

static void TestBase(void) {
  phase = "base";
  Bool b = TRUE;
  CHECK(sizeof b == 1);
  CHECK(Tvx_GetVersion() != NULL && strlen(Tvx_GetVersion()) > 0);
  Tvx_SetLogSink(CountingSink, NULL);
  Tvx_SetLogSink(NULL, NULL);
}

static void TestIso9660(void) {
  phase = "iso9660";
  Iso9660Image *image = (Iso9660Image *)&image; /* must be cleared */
  uint32_t formats = 0;
  CHECK(Iso9660_Open("/nonexistent/tvx-missing.iso", 0, &image) == ISO9660_ERR_IO);
  CHECK(image == NULL);
  CHECK(Iso9660_ListFormats("/nonexistent/tvx-missing.iso", &formats) == ISO9660_ERR_IO);
  CHECK(Iso9660_GetVolumeId(NULL) == NULL);
  CHECK(sizeof(((Iso9660DirEntry *)0)->name) == 256);
}

int main(void) {
  TestBase();
  TestIso9660();
  if (failures == 0) printf("c_api: all phases passed\n");
  return failures == 0 ? 0 : 1;
}
