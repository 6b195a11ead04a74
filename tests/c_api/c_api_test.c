/* Compiles every public header as C11 and calls through each from C, so a C
 * host can build and link against them; what the calls compute is tested in
 * C++ elsewhere. Here: exported symbols, structures read from C, output
 * parameters cleared on failure and NULL arguments. Returns 0 when every
 * phase passes. */
#define _POSIX_C_SOURCE 200809L /* mkstemp */
#include "tvx_all_headers.h"

/* OpenSSL's declarations after ours (c_api_openssl_first.c has the other
 * order): both must agree. */
#include <openssl/pkcs7.h>
#include <openssl/x509_vfy.h>

#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <unistd.h>

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

static void TestBaseAndReaders(void) {
  Iso9660Image *image = (Iso9660Image *)&image; /* must be cleared */
  uint32_t formats = 0;
  Bool b = TRUE;
  phase = "base and readers";
  CHECK(sizeof b == 1);
  CHECK(sizeof(((Iso9660DirEntry *)0)->name) == 256);
  CHECK(Tvx_GetVersion() != NULL && strlen(Tvx_GetVersion()) > 0);
  Tvx_SetLogSink(CountingSink, NULL);
  Tvx_SetLogSink(NULL, NULL);
  CHECK(Iso9660_Open("/nonexistent/tvx-missing.iso", 0, &image) == ISO9660_ERR_IO);
  CHECK(image == NULL);
  CHECK(Iso9660_ListFormats("/nonexistent/tvx-missing.iso", &formats) == ISO9660_ERR_IO);
  CHECK(Iso9660_GetVolumeId(NULL) == NULL);
  CHECK(Iso9660_ListTree(NULL, "", TRUE, NULL, NULL) == ISO9660_ERR_ARGUMENT);
  CHECK(UDF_Open("/nonexistent/tvx-udf-test.iso") == NULL);
  CHECK(UDF_OpenWithReader(NULL, NULL, NULL) == NULL);
  CHECK(UDF_CloseDir(NULL) == FALSE);
  CHECK(UDF_GetVolumeId(NULL) == NULL);
  CHECK(UDF_ListTree(NULL, "", TRUE, NULL, NULL) == UDF_TREE_ERR_ARGUMENT);
  CHECK(UDF_Extract(NULL, "", "/tmp") == UDF_TREE_ERR_ARGUMENT);
  UDF_Close(NULL);
}

/* A fresh floppy through the FAT, floppy and INI calls. */
static void TestFloppyAndIni(void) {
  char path[] = "/tmp/tvx_c_api_flp_XXXXXX";
  char value[8];
  FATVolume *vol = NULL;
  FATDirectory *root = NULL;
  int fd = mkstemp(path);
  phase = "floppy and ini";
  CHECK(fd >= 0);
  if (fd < 0) return;
  close(fd);
  CHECK(FAT_FormatVolume(FATDevFileIO_Open(path), FAT_FLOPPY_SIZE, 0, &vol) == FAT_OK);
  CHECK(FAT_OpenRootDirectory(vol, &root) == FAT_OK);
  CHECK(AddFileToFloppyImg(root, "/dev/null", "empty.txt"));
  CHECK(GetFileFromFloppyImg(root, "EMPTY.TXT", "/dev/null"));
  CHECK(!GetFileFromFloppyImg(root, "absent", "/dev/null"));
  CHECK(FAT_CloseDirectory(root) == FAT_OK && FAT_CloseVolume(vol) == FAT_OK);
  CHECK(!AutoInstall_MakeFloppyImg(NULL, "/tmp", NULL, NULL, NULL, NULL));
  CHECK(!AutoInstall_AddFileToFloppyImg(path, "x.txt", "/nonexistent/tvx-config"));
  WriteOEMDriverInfo("/nonexistent/txtsetup.oem", "/nonexistent/winnt.sif");
  remove(path);
  CHECK(!IniUtil_GetIniFileString(path, "Data", "AutoPartition", value, (int32_t)sizeof value));
  CHECK(!IniUtil_WriteIniFileString(path, "S", "K", "v", FALSE));
}

/* The configuration structure as a C caller reads it, and the answer file
 * calls refusing guests of the other family. */
static void TestAutoInstall(void) {
  GuessResult guess;
  AutoInstallConfigInfo info;
  char *message = NULL;
  char hash[128];
  phase = "autoinstall";
  memset(&guess, 0, sizeof guess);
  guess.guestOS = "centos7-64";
  guess.version = GUESS_VERSION_CENTOS_7;
  CHECK(AutoInstall_IsSupportedGuest(&guess));
  CHECK(AutoInstall_GetInstallConfigInfo("linux", &guess, &info));
  CHECK(info.shortNameMaxLength == 32 && info.nameMaxLength == 52);
  CHECK(info.reservedShortNames != NULL && strcmp(info.reservedShortNames[0].name, "root") == 0);
  CHECK(AutoInstall_ValidateShortName("linux", &guess, "Bob", &message) ==
        AUTOINSTALL_TEXT_BAD_LINUX_USERNAME);
  CHECK(message != NULL);
  free(message);
  CHECK(AutoInstallValidateWindowsText(NULL, "a,b", AUTOINSTALL_TEXT_NAME, NULL) ==
        AUTOINSTALL_TEXT_BAD_WINDOWS_NAME);
  free(AutoInstall_GetPrettyWindowsName("Windows 10 ENTERPRISEN"));
  CHECK(!AutoInstall_PrepareAnswerFileEx("/nonexistent/winnt.sif", "/nonexistent/a.xml", NULL,
                                         NULL, "Jane Doe", NULL, "centos7-64",
                                         GUESS_VERSION_CENTOS_7, "/nonexistent", NULL, "x", TRUE,
                                         FALSE));
  CHECK(!AutoInstall_PrepareAnswerFileEx_Linux("windows9-64", 0, "/nonexistent", "jo", "Jo", "pw",
                                               "pw", NULL, FALSE, 0, FALSE));
  CHECK(SHA256_crypt("Hello world!", "$5$saltstring", hash, (int)sizeof hash) == hash);
  CHECK(AutoInstall_NeedsFloppy_Linux("ubuntu-64") && !AutoInstall_NeedsFloppy_Linux("centos7-64"));
  CHECK(AutoInstall_MakeFloppyImg_Linux("/nonexistent", "/nonexistent", NULL, "centos7-64"));
  CHECK(!AutoInstall_MasterISO("/nonexistent", NULL, "/nonexistent"));
  CHECK(!AutoInstall_ScanDisk("/nonexistent", "/proc/nonexistent", "centos7-64", 0, NULL));
  CHECK(!AutoInstall_ScanISO("/nonexistent", "/proc/nonexistent", NULL, 0, NULL));
  CHECK(!AutoInstall_AddTools_Linux("/nonexistent", "/nonexistent"));
}

/* A tools status that needs no file: a guest that reported no tools with
 * legacy number 0 has none, and the report says it was not evaluated. */
static void TestToolsVersion(void) {
  Dictionary *config = Dictionary_Create();
  ToolsVersionReport *report = NULL;
  char *value;
  phase = "toolsversion";
  CHECK(Dict_SetString(config, "winXPPro", "%s", "guestOS"));
  value = Dict_GetString(config, NULL, "guestOS");
  CHECK(value != NULL && strcmp(value, "winXPPro") == 0);
  free(value);
  CHECK(!Dictionary_LoadEx(config, "/nonexistent/tvx-vm.tvx", NULL));
  CHECK(ToolsVersion_GetStatusReport("/nonexistent/vm.tvx", config, NULL, "", 0, 0, NULL, &report) ==
        TOOLS_STATUS_NOT_INSTALLED);
  CHECK(report != NULL && report->status == TOOLS_STATUS_NOT_INSTALLED && !report->evaluated);
  ToolsVersion_FreeReport(report);
  CHECK(ToolsVersion_SaveXmlInfo("/nonexistent/vm.tvx", NULL, NULL, 3, 0));
  CHECK(strcmp(ToolsVersion_StatusName(42), "TOOLS_STATUS_INVALID") == 0);
  Dictionary_Free(config);
}

static void TestGuess(void) {
  GuessResult r;
  unsigned char elf[20] = {0};
  phase = "guess";
  memset(&r, 0x5A, sizeof r);
  CHECK(Guess_Guest("/nonexistent/image.iso", NULL, &r) == 2);
  CHECK(r.guestOS == NULL && r.language[0] == '\0');
  CHECK(Guess_IsEqual(&r, &r));
  CHECK(strcmp(Guess_GetSubString(GUESS_VERSION_UNKNOWN), SUB_NAMES[0]) == 0);
  r.guestOS = "winXPPro";
  free(Guess_GetVersionString("Windows XP Professional", &r));
  elf[18] = 62;
  CHECK(Guess_ELF_Arch(elf, sizeof elf) == GUESS_ELF_ARCH_X86_64);
}

/* Signature, hash-data and tools image calls that need no PKI. */
static void TestSignatureAndToolsImage(void) {
  char *err = NULL;
  PKCS7 *p7 = NULL;
  uint8_t header[600] = {0};
  ToolsIsoLocalFile *local = NULL;
  ToolsIsoImageInfo info;
  phase = "signature and tools image";
  CHECK(!ZelSign_IsTrxSignatureValid(p7, "x", 0, NULL, (X509_STORE *)NULL, &err));
  CHECK(err != NULL && strcmp(err, "Data buffer too small.") == 0);
  free(err);
  CHECK(ToolsISO_GetHashImpl("SHA-256") != NULL);
  CHECK(ToolsISO_ParseHashData(header, sizeof header) == NULL);
  CHECK(!ToolsISO_VerifySignature(NULL, "x", 1, "y", 1));
  ToolsISO_FreeHashInfo(NULL);
  CHECK(ToolsISO_ValidateName("linux.iso") && !ToolsISO_ValidateName("../linux.iso"));
  CHECK(ToolsISO_GetImageBaseName(20510) != NULL);
  CHECK(ToolsISO_LocalFileOpen("/nonexistent/tvx-tools.iso", FALSE, &local) == TOOLSISO_OPEN_IO_ERROR);
  CHECK(local == NULL && !ToolsISO_GetImageInfo(NULL, &info));
}

/* Exported calls made in C++ only: the link fails if one is not exported. */
typedef void (*AnyFn)(void);
static const AnyFn exported[] = {
    (AnyFn)IniUtil_GetIniFileInt,     (AnyFn)IniUtil_WriteIniFileInt,
    (AnyFn)ToolsVersion_GetStatus,    (AnyFn)ToolsVersion_ComponentStatusText,
    (AnyFn)ZelSign_StatusToString,    (AnyFn)ToolsISO_GetRefreshCount,
    (AnyFn)AutoInstall_ValidatePassword,
};

int main(void) {
  size_t i;
  phase = "exported";
  for (i = 0; i < sizeof exported / sizeof exported[0]; i++) CHECK(exported[i] != NULL);
  TestBaseAndReaders();
  TestGuess();
  TestToolsVersion();
  TestFloppyAndIni();
  TestAutoInstall();
  TestSignatureAndToolsImage();
  if (failures == 0) printf("c_api: all phases passed\n");
  return failures == 0 ? 0 : 1;
}
