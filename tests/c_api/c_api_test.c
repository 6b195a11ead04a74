/* Compiles every public header as C11 and calls through them from C, so a C
 * host can build and link against them; what the calls compute is tested in
 * C++ elsewhere, the export list by tests/cli/exports.sh. Here: structures
 * read from C, output parameters cleared on failure and NULL arguments.
 * Returns 0 when every phase passes. */
#include "tvx_all_headers.h"

/* OpenSSL's declarations after ours (c_api_openssl_first.c has the other
 * order): both must agree. */
#include <openssl/pkcs7.h>
#include <openssl/x509_vfy.h>

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

static void CountingSink(TvxLogLevel level, const char *text, void *ctx) {
  (void)level;
  (void)text;
  (*(int *)ctx)++;
}

static void TestBaseAndReaders(void) {
  Iso9660Image *image = (Iso9660Image *)&image; /* must be cleared */
  Bool b = TRUE;
  phase = "base and readers";
  CHECK(sizeof b == 1);
  CHECK(sizeof(((Iso9660DirEntry *)0)->name) == 256);
  CHECK(Tvx_GetVersion() != NULL && strlen(Tvx_GetVersion()) > 0);
  CHECK(Iso9660_Open("/nonexistent/tvx-missing.iso", 0, &image) == ISO9660_ERR_IO);
  CHECK(image == NULL);
  CHECK(Iso9660_GetVolumeId(NULL) == NULL);
  CHECK(Iso9660_ListTree(NULL, "", TRUE, NULL, NULL) == ISO9660_ERR_ARGUMENT);
  CHECK(UDF_OpenWithReader(NULL, NULL, NULL) == NULL);
  CHECK(UDF_CloseDir(NULL) == FALSE);
  CHECK(UDF_GetVolumeId(NULL) == NULL);
  CHECK(UDF_ListTree(NULL, "", TRUE, NULL, NULL) == UDF_TREE_ERR_ARGUMENT);
  CHECK(UDF_Extract(NULL, "", "/tmp") == UDF_TREE_ERR_ARGUMENT);
  UDF_Close(NULL);
}

/* The configuration structure as a C caller reads it, and a message the
 * caller frees. */
static void TestAutoInstall(void) {
  GuessResult guess;
  AutoInstallConfigInfo info;
  char *message = NULL;
  phase = "autoinstall";
  memset(&guess, 0, sizeof guess);
  guess.guestOS = "centos7-64";
  guess.version = GUESS_VERSION_CENTOS_7;
  CHECK(AutoInstall_GetInstallConfigInfo("linux", &guess, &info));
  CHECK(info.shortNameMaxLength == 32 && info.nameMaxLength == 52);
  CHECK(info.reservedShortNames != NULL && strcmp(info.reservedShortNames[0].name, "root") == 0);
  CHECK(AutoInstall_ValidateShortName("linux", &guess, "Bob", &message) ==
        AUTOINSTALL_TEXT_BAD_LINUX_USERNAME);
  CHECK(message != NULL);
  free(message);
}

/* A tools status that needs no file: a guest that reported no tools with
 * legacy number 0 has none, and the report says it was not evaluated. */
static void TestToolsVersion(void) {
  Dictionary *config = Dictionary_Create();
  ToolsVersionReport *report = NULL;
  phase = "toolsversion";
  CHECK(Dict_SetString(config, "winXPPro", "%s", "guestOS"));
  CHECK(ToolsVersion_GetStatusReport("/nonexistent/vm.tvx", config, NULL, "", 0, 0, NULL, &report) ==
        TOOLS_STATUS_NOT_INSTALLED);
  CHECK(report != NULL && report->status == TOOLS_STATUS_NOT_INSTALLED && !report->evaluated);
  ToolsVersion_FreeReport(report);
  Dictionary_Free(config);
}

static void TestGuess(void) {
  GuessResult r;
  phase = "guess";
  memset(&r, 0x5A, sizeof r);
  CHECK(Guess_Guest("/nonexistent/image.iso", NULL, &r) == 2);
  CHECK(r.guestOS == NULL && r.language[0] == '\0');
  CHECK(strcmp(Guess_GetSubString(GUESS_VERSION_UNKNOWN), SUB_NAMES[0]) == 0);
}

/* Signature and tools image calls that need no PKI. */
static void TestSignatureAndToolsImage(void) {
  char *err = NULL;
  ToolsIsoLocalFile *local = (ToolsIsoLocalFile *)&local; /* must be cleared */
  ToolsIsoImageInfo info;
  uint8_t header[600] = {0};
  phase = "signature and tools image";
  CHECK(!ZelSign_IsTrxSignatureValid(NULL, "x", 0, NULL, (X509_STORE *)NULL, &err));
  CHECK(err != NULL);
  free(err);
  CHECK(ToolsISO_ParseHashData(header, sizeof header) == NULL);
  CHECK(!ToolsISO_VerifySignature(NULL, "x", 1, "y", 1));
  ToolsISO_FreeHashInfo(NULL);
  CHECK(ToolsISO_LocalFileOpen("/nonexistent/tvx-tools.iso", FALSE, &local) == TOOLSISO_OPEN_IO_ERROR);
  CHECK(local == NULL && !ToolsISO_GetImageInfo(NULL, &info));
}

int main(void) {
  int sinkCalls = 0;
  Tvx_SetLogSink(CountingSink, &sinkCalls);
  TestBaseAndReaders();
  TestGuess();
  TestToolsVersion();
  TestAutoInstall();
  TestSignatureAndToolsImage();
  Tvx_SetLogSink(NULL, NULL);
  phase = "log sink";
  CHECK(sinkCalls > 0);
  if (failures == 0) printf("c_api: all phases passed\n");
  return failures == 0 ? 0 : 1;
}
