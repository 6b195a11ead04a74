/* Compiles every public header as C11 and calls through each, so a C host
 * can build against them. Returns 0 when every phase passes. */
#define _POSIX_C_SOURCE 200809L /* mkstemp, fdopen */
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
  CHECK(UDF_ListTree(NULL, "", TRUE, NULL, NULL) == UDF_TREE_ERR_ARGUMENT);
  CHECK(UDF_Extract(NULL, "", "/tmp") == UDF_TREE_ERR_ARGUMENT);
  CHECK(Iso9660_ListTree(NULL, "", TRUE, NULL, NULL) == ISO9660_ERR_ARGUMENT);
  UDF_Close(NULL);
}

/* Writes through the INI calls into a temporary file and reads back. */
static void TestIni(void) {
  char path[] = "/tmp/tvx_c_api_ini_XXXXXX";
  char value[32] = "";
  int32_t n = 0;
  FILE *f;
  int fd;
  phase = "ini";
  fd = mkstemp(path);
  CHECK(fd >= 0);
  if (fd < 0) return;
  f = fdopen(fd, "w");
  fputs("; answer file\n[Data]\nAutoPartition=1\n", f);
  fclose(f);
  CHECK(IniUtil_WriteIniFileString(path, "UserData", "FullName", "Jane Doe", TRUE));
  CHECK(IniUtil_WriteIniFileInt(path, "Data", "AutoPartition", 0));
  CHECK(IniUtil_GetIniFileString(path, "userdata", "fullname", value, (int32_t)sizeof value));
  CHECK(strcmp(value, "Jane Doe") == 0);
  CHECK(IniUtil_GetIniFileInt(path, "Data", "AutoPartition", &n) && n == 0);
  CHECK(!IniUtil_GetIniFileString(path, "Data", "AutoPartition", NULL, 8));
  remove(path);
  CHECK(!IniUtil_WriteIniFileString(path, "S", "K", "v", FALSE));
}

/* A fresh floppy: the transfer calls and the Windows floppy calls. */
static void TestFloppy(void) {
  char path[] = "/tmp/tvx_c_api_flp_XXXXXX";
  FATVolume *vol = NULL;
  FATDirectory *root = NULL;
  int fd = mkstemp(path);
  phase = "floppy";
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
}

/* Support, limits and validation for a hand-made recognition result. */
static void TestAutoInstall(void) {
  GuessResult guess;
  AutoInstallConfigInfo info;
  char *message = NULL;
  char *pretty;
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
  CHECK(AutoInstall_ValidatePassword("linux", &guess, "a,b", NULL) == AUTOINSTALL_TEXT_OK);
  CHECK(AutoInstallValidateWindowsText(NULL, "a,b", AUTOINSTALL_TEXT_NAME, NULL) ==
        AUTOINSTALL_TEXT_BAD_WINDOWS_NAME);
  pretty = AutoInstall_GetPrettyWindowsName("Windows 10 ENTERPRISEN");
  CHECK(pretty != NULL && strcmp(pretty, "Windows 10 Enterprise N") == 0);
  free(pretty);
}

/* Answer files of a Windows guest from the shipped templates. */
static void TestWindowsAnswers(void) {
  const char *src = getenv("TVX_SOURCE_DIR");
  char dir[] = "/tmp/tvx_c_api_win_XXXXXX";
  char sif[512], xml[512], out[600];
  static const char *const written[] = {"winnt.sif", "autoun~0.xml"};
  size_t i;
  phase = "windows answers";
  if (src == NULL || mkdtemp(dir) == NULL) {
    CHECK(!"TVX_SOURCE_DIR set and temporary directory made");
    return;
  }
  snprintf(sif, sizeof sif, "%s/data/windows/winnt.sif", src);
  snprintf(xml, sizeof xml, "%s/data/windows/autounattend.xml", src);
  CHECK(AutoInstall_PrepareAnswerFileEx(sif, xml, NULL, NULL, "Jane Doe", "pw", "windows9-64",
                                        GUESS_VERSION_WINDOWS_10_PLAIN, dir, NULL,
                                        "Windows 10 Pro", TRUE, FALSE));
  for (i = 0; i < sizeof written / sizeof written[0]; i++) {
    FILE *f;
    snprintf(out, sizeof out, "%s/%s", dir, written[i]);
    f = fopen(out, "r");
    CHECK(f != NULL);
    if (f != NULL) fclose(f);
    remove(out);
  }
  CHECK(!AutoInstall_PrepareAnswerFileEx(sif, xml, NULL, NULL, "Jane Doe", NULL, "centos7-64",
                                         GUESS_VERSION_CENTOS_7, dir, NULL, "x", TRUE, FALSE));
  remove(dir);
}

/* The SHA-256 crypt and a Linux answer file. */
static void TestLinuxAnswers(void) {
  char dir[] = "/tmp/tvx_c_api_linux_XXXXXX";
  char out[600], hash[128];
  phase = "linux answers";
  CHECK(SHA256_crypt("Hello world!", "$5$saltstring", hash, (int)sizeof hash) == hash);
  CHECK(strcmp(hash, "$5$saltstring$5B8vYYiY.CVt1RlTTf8KbXBH3hsxY/GNooZaBBGWEc5") == 0);
  if (mkdtemp(dir) == NULL) {
    CHECK(!"temporary directory made");
    return;
  }
  CHECK(AutoInstall_PrepareAnswerFileEx_Linux("centos7-64", GUESS_VERSION_CENTOS_7, dir, "jo",
                                              "Jo Doe", "pw", "rootpw", NULL, FALSE, 0, FALSE));
  snprintf(out, sizeof out, "%s/ks.cfg", dir);
  CHECK(remove(out) == 0);
  CHECK(!AutoInstall_PrepareAnswerFileEx_Linux("windows9-64", 0, dir, "jo", "Jo", "pw", "pw",
                                               NULL, FALSE, 0, FALSE));
  remove(dir);
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

/* Builds a VM configuration through the exported dictionary calls and asks
 * for a tools status that needs no file: mode 5 is never applicable, and a
 * guest that reported no tools with legacy number 0 has none. */
static void TestToolsVersion(void) {
  Dictionary *config = Dictionary_Create();
  char *value;
  ToolsVersionReport *report = NULL;
  phase = "toolsversion";
  CHECK(Dict_SetString(config, "winXPPro", "%s", "guestOS"));
  CHECK(!Dict_SetString(config, "x", "bad name"));
  value = Dict_GetString(config, NULL, "guestOS");
  CHECK(value != NULL && strcmp(value, "winXPPro") == 0);
  free(value);
  value = Dict_GetString(config, "dflt", "libdir");
  CHECK(value != NULL && strcmp(value, "dflt") == 0);
  free(value);
  CHECK(!Dictionary_LoadEx(config, "/nonexistent/tvx-vm.tvx", NULL));
  CHECK(ToolsVersion_GetStatus("/nonexistent/vm.tvx", config, NULL, "", 10252, 5) ==
        TOOLS_STATUS_NOT_APPLICABLE);
  CHECK(ToolsVersion_GetStatusReport("/nonexistent/vm.tvx", config, NULL, "", 0, 0, NULL, &report) ==
        TOOLS_STATUS_NOT_INSTALLED);
  CHECK(report != NULL && report->status == TOOLS_STATUS_NOT_INSTALLED && !report->evaluated);
  ToolsVersion_FreeReport(report);
  CHECK(ToolsVersion_SaveXmlInfo("/nonexistent/vm.tvx", NULL, NULL, 3, 0));
  CHECK(!ToolsVersion_SaveXmlInfo("/nonexistent/vm.tvx", "null", NULL, 3, 1));
  CHECK(strcmp(ToolsVersion_ComponentStatusText(TOOLS_COMPONENT_MISSING),
               "missing from the guest") == 0);
  CHECK(strcmp(ToolsVersion_StatusName(42), "TOOLS_STATUS_INVALID") == 0);
  Dictionary_Free(config);
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

/* Signature and hash-data calls that need no PKI. */
static void TestSignature(void) {
  char *err = NULL;
  PKCS7 *p7 = NULL;
  uint8_t header[600] = {0};
  phase = "signature";
  CHECK(strcmp(ZelSign_StatusToString(7), "Error") == 0);
  CHECK(!ZelSign_IsTrxSignatureValid(p7, "x", 0, NULL, (X509_STORE *)NULL, &err));
  CHECK(err != NULL && strcmp(err, "Data buffer too small.") == 0);
  free(err);
  CHECK(ToolsISO_GetHashImpl("SHA-256") != NULL);
  CHECK(ToolsISO_ParseHashData(header, sizeof header) == NULL);
  CHECK(!ToolsISO_VerifySignature(NULL, "x", 1, "y", 1));
  ToolsISO_FreeHashInfo(NULL);
}

static void TestToolsImage(void) {
  ToolsIsoLocalFile *local = NULL;
  ToolsIsoImageInfo info;
  phase = "tools_image";
  CHECK(ToolsISO_ValidateName("linux.iso") && !ToolsISO_ValidateName("../linux.iso"));
  CHECK(ToolsISO_GetImageBaseName(20510) != NULL && ToolsISO_GetRefreshCount() >= 1);
  CHECK(ToolsISO_LocalFileOpen("/nonexistent/tvx-tools.iso", FALSE, &local) == TOOLSISO_OPEN_IO_ERROR);
  CHECK(local == NULL && !ToolsISO_GetImageInfo(NULL, &info));
}

/* Linux install media: what needs a floppy, and calls that need no files. */
static void TestLinuxMedia(void) {
  phase = "linux media";
  CHECK(AutoInstall_NeedsFloppy_Linux("ubuntu-64"));
  CHECK(!AutoInstall_NeedsFloppy_Linux("centos7-64"));
  CHECK(AutoInstall_MakeFloppyImg_Linux("/nonexistent", "/nonexistent", NULL, "centos7-64"));
  CHECK(!AutoInstall_MasterISO("/nonexistent", NULL, "/nonexistent"));
  CHECK(!AutoInstall_ScanDisk("/nonexistent", "/proc/nonexistent", "centos7-64", 0, NULL));
  CHECK(!AutoInstall_ScanISO("/nonexistent", "/proc/nonexistent", NULL, 0, NULL));
  CHECK(!AutoInstall_AddTools_Linux("/nonexistent", "/nonexistent"));
}

int main(void) {
  TestBase();
  TestGuess();
  TestToolsVersion();
  TestIso9660();
  TestUdf();
  TestIni();
  TestAutoInstall();
  TestWindowsAnswers();
  TestSignature();
  TestFloppy();
  TestLinuxAnswers();
  TestToolsImage();
  TestLinuxMedia();
  if (failures == 0) printf("c_api: all phases passed\n");
  return failures == 0 ? 0 : 1;
}
