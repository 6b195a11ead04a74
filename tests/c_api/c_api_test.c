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

static void TestUdf(void) {
  phase = "udf_open_missing";
  CHECK(UDF_Open("/nonexistent/tvx-udf-test.iso") == NULL);
  CHECK(UDF_OpenWithReader(NULL, NULL, NULL) == NULL);
  CHECK(UDF_CloseDir(NULL) == FALSE);
  CHECK(UDF_GetVolumeId(NULL) == NULL);
  UDF_Close(NULL);
}

int main(void) {
  TestBase();
  TestUdf();
  if (failures == 0) printf("c_api: all phases passed\n");
  return failures == 0 ? 0 : 1;
}
