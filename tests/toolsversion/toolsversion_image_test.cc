// The status end to end on real artefacts: a tools image mastered with
// xorriso that carries "manifest.txt", its hash data written by
// `tvxguest hashdata create` and signed by the test PKI, and an AVR manifest
// signed with the openssl CLI; then what a missing, tampered or wrongly
// signed piece does to the status.
#include <gtest/gtest.h>

#include <filesystem>
#include <string>

#include "lib/toolsImage/toolsiso_image_internal.h"
#include "support/log_capture.h"
#include "support/test_pki.h"
#include "toolsImage/signed_image.h"
#include "tvx_toolsversion.h"

namespace {

namespace fs = std::filesystem;
using tvxtest::ReadFileOrDie;
using tvxtest::WriteFileOrDie;

constexpr const char kHostManifest[] =
    "monolithic.version = 12.2.0\nnetdriver.version = 12.2.0\nresult.log = true\n";
constexpr const char kAvr[] =
    "monolithic.version = 12.0.0\nmonolithic.version_max = 12.9\n"
    "monolithic.version_illegal = 12.1.1\n";

enum class Fault { kGood, kNoAvr, kStrangerAvr, kTamperedImage, kStrangerHash };

class ToolsVersionImage : public ::testing::Test {
 protected:
  // The pristine artefacts, made once.
  static void SetUpTestSuite() {
    certDir_ = tvxtest::TestCertDir();
    if (certDir_.empty()) return;
    pristine_ = new tvxtest::TempDir;
    ASSERT_NE(tvxtest::SignedToolsImage(*pristine_, certDir_, "linux.iso", kHostManifest), "");
    WriteFileOrDie(pristine_->Join("linux_avr_manifest.txt"), kAvr);
    WriteFileOrDie(pristine_->Join("linux_avr_manifest.txt.sig"),
                   tvxtest::Sign(certDir_, "maker", kAvr, false));
  }
  static void TearDownTestSuite() {
    delete pristine_;
    pristine_ = nullptr;
  }

  void SetUp() override {
    if (certDir_.empty()) GTEST_SKIP() << "no test certificate directory";
  }

  // Tools makes the tools directory of one case and the VM configuration.
  void Tools(Fault setup) {
    tvx::toolsiso::ResetSelectionState();
    std::string images = dir_.Join("tools/isoimages");
    fs::remove_all(dir_.Join("tools"));
    fs::create_directories(images);
    for (const char *f : {"linux.iso", "linux.iso.sha", "linux.iso.sig", "linux_avr_manifest.txt",
                          "linux_avr_manifest.txt.sig"}) {
      fs::copy_file(pristine_->Join(f), images + "/" + f);
    }
    if (setup == Fault::kNoAvr) fs::remove(images + "/linux_avr_manifest.txt");
    if (setup == Fault::kStrangerAvr) {
      WriteFileOrDie(images + "/linux_avr_manifest.txt.sig",
                     tvxtest::Sign(certDir_, "stranger", kAvr, false));
    }
    if (setup == Fault::kTamperedImage) {
      std::string bytes = ReadFileOrDie(images + "/linux.iso");
      size_t at = bytes.find("netdriver.version");
      ASSERT_NE(at, std::string::npos);
      bytes[at] = 'V';
      WriteFileOrDie(images + "/linux.iso", bytes);
    }
    if (setup == Fault::kStrangerHash) {
      WriteFileOrDie(
          images + "/linux.iso.sig",
          tvxtest::Sign(certDir_, "stranger", ReadFileOrDie(images + "/linux.iso.sha"), false));
    }
    WriteFileOrDie(dir_.Join("vm.tvx"), "guestOS = ubuntu-64\nlibdir = \"" + dir_.Join("tools") +
                                            "\"\nextendedConfigFile = vm.xml\n");
    Dictionary_Free(config_);
    config_ = Dictionary_Create();
    ASSERT_TRUE(Dictionary_LoadEx(config_, dir_.Join("vm.tvx").c_str(), nullptr));
  }
  void TearDown() override { Dictionary_Free(config_); }

  static std::string certDir_;
  static tvxtest::TempDir *pristine_;
  tvxtest::TempDir dir_;
  Dictionary *config_ = nullptr;
};

std::string ToolsVersionImage::certDir_;
tvxtest::TempDir *ToolsVersionImage::pristine_ = nullptr;

TEST_F(ToolsVersionImage, GuestAgainstSignedImageAndAvr) {
  struct Case {
    const char *name;
    Fault setup;
    const char *guest;
    uint32_t status;     // of the evaluation
    const char *logged;  // a line the case must log
  } cases[] = {
      // How the buckets rate each version is the evaluation test's; here
      // netdriver, known from the image's manifest only, must decide beside a
      // supported old monolithic version. (The AVR's illegal list and maximum
      // arriving from the signed file: the guest-manifest test.)
      {"older but supported", Fault::kGood, "monolithic.version = 12.1\n",
       TOOLS_STATUS_SUPPORTED_OLD,
       "ToolsVersion: Status is supported old because this is status of monolithic version, and "
       "netdriver is missing from the guest.\n"},
      {"no AVR: the host version is the minimum", Fault::kNoAvr, "monolithic.version = 12.1\n",
       TOOLS_STATUS_TOO_OLD,
       "ToolsVersion: GetHostManifests: Done extracting the manifest file.\n"},
      {"AVR signed by a stranger is ignored", Fault::kStrangerAvr, "monolithic.version = 12.1\n",
       TOOLS_STATUS_TOO_OLD, "ToolsVersion: AVR file corrupted, ignoring AVR values\n"},
      {"tampered image", Fault::kTamperedImage, "monolithic.version = 12.2\n", TOOLS_STATUS_UNKNOWN,
       "ToolsVersion: Error getting host tools manifest files.\n"},
      {"hash data signed by a stranger", Fault::kStrangerHash, "monolithic.version = 12.2\n",
       TOOLS_STATUS_UNKNOWN, "ToolsVersion: Failed to verify signature for Tools ISO image.\n"},
  };
  for (const Case &c : cases) {
    SCOPED_TRACE(c.name);
    Tools(c.setup);
    tvxtest::LogCapture log;
    ToolsVersionReport *report = nullptr;
    ToolsVersion_GetStatusReport(dir_.Join("vm.tvx").c_str(), config_, nullptr, c.guest, 12000, 0,
                                 nullptr, &report);
    ASSERT_NE(report, nullptr);
    // A failed fetch is retried with the legacy number, which fails alike.
    EXPECT_EQ(report->manifestStatus, c.status);
    EXPECT_TRUE(log.Contains(c.logged)) << log.All();
    ToolsVersion_FreeReport(report);
  }
}

TEST_F(ToolsVersionImage, GuestManifestFileAndSavedManifest) {
  Tools(Fault::kGood);
  // From a file: the host manifest is extracted beside it and removed again.
  WriteFileOrDie(dir_.Join("guest.txt"), "monolithic.version = 13\n");
  EXPECT_EQ(ToolsVersion_GetStatus(dir_.Join("vm.tvx").c_str(), config_,
                                   dir_.Join("guest.txt").c_str(), nullptr, 12384, 0),
            TOOLS_STATUS_TOO_NEW);
  EXPECT_FALSE(fs::exists(dir_.Join("guest.txt.iso.shipped")));
  // From the extended config file, after a save of the agent's report.
  WriteFileOrDie(dir_.Join("vm.xml"), "<vm/>");
  ASSERT_TRUE(ToolsVersion_SaveXmlInfo(
      dir_.Join("vm.tvx").c_str(),
      "<a><tools><monolithic guestVersion=\"12.1.1\" status=\"9\"/></tools></a>", nullptr, 0, 0));
  EXPECT_EQ(
      ToolsVersion_GetStatus(dir_.Join("vm.tvx").c_str(), config_, nullptr, nullptr, 12384, 0),
      TOOLS_STATUS_BLACKLISTED);
}

}  // namespace
