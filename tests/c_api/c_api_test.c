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

static void TestGuess(void) {
  phase = "guess";
  GuessResult r;
  memset(&r, 0x5A, sizeof r);
  CHECK(Guess_Guest("/nonexistent/image.iso", NULL, &r) == 2);
  CHECK(r.guestOS == NULL && r.language[0] == '\0');
  CHECK(Guess_IsEqual(&r, &r));
  CHECK(strcmp(Guess_GetSubString(GUESS_VERSION_UNKNOWN), SUB_NAMES[0]) == 0);
  r.guestOS = "winXPPro";
  char *text = Guess_GetVersionString("Windows XP Professional", &r);
  CHECK(text != NULL && strcmp(text, "Windows XP Professional") == 0);
  free(text);
  unsigned char elf[20] = {0};
  elf[18] = 62;
  CHECK(Guess_ELF_Arch(elf, sizeof elf) == GUESS_ELF_ARCH_X86_64);
}

int main(void) {
  TestBase();
  TestGuess();
  if (failures == 0) printf("c_api: all phases passed\n");
  return failures == 0 ? 0 : 1;
}
