// ToolsVersion_GetStatus without a usable tools image (the legacy number and
// the guest's limits decide), the legacy number read from qemu-img disks,
// and the extended config file: saved status, save/read round trip checked
// with XPath, and a rewrite that fails half way.
#include <gtest/gtest.h>
#include <sys/resource.h>

#include <csignal>
#include <filesystem>
#include <string>
#include <vector>

#include "support/log_capture.h"
#include "support/run_argv.h"
#include "support/unattend_xml.h"
#include "tvx_toolsversion.h"

namespace {

using tvxtest::TempDir;
using tvxtest::WriteFileOrDie;

class ToolsVersionStatus : public ::testing::Test {
 protected:
  // Config writes the VM configuration (the tools directory is empty, so no
  // host manifest can be had) and loads it.
  Dictionary *Config(const std::string &extra) {
    WriteFileOrDie(
        dir_.Join("vm.tvx"),
        "libdir = \"" + dir_.Path() + "/no-tools\"\nextendedConfigFile = \"vm.xml\"\n" + extra);
    Dictionary_Free(config_);
    config_ = Dictionary_Create();
    EXPECT_TRUE(Dictionary_LoadEx(config_, ConfigPath().c_str(), nullptr));
    return config_;
  }
  std::string ConfigPath() const { return dir_.Join("vm.tvx"); }
  std::string Xml() const { return tvxtest::ReadFileOrDie(dir_.Join("vm.xml")); }
  // The count of the nodes `expr` selects in the saved file and their texts
  // joined by "|": "2:a|b".
  std::string XPath(const char *expr) const {
    std::vector<std::string> texts = tvxtest::UnattendXml(dir_.Join("vm.xml")).Texts(expr);
    std::string out = std::to_string(texts.size()) + ":";
    for (size_t i = 0; i < texts.size(); ++i) out += (i > 0 ? "|" : "") + texts[i];
    return out;
  }
  void TearDown() override { Dictionary_Free(config_); }

  TempDir dir_;
  Dictionary *config_ = nullptr;
};

TEST_F(ToolsVersionStatus, LegacyNumberAgainstTheGuestsLimits) {
  std::string disk9216 = tvxtest::MakeSparseVmdk(dir_.Join("a.vmdk"), 9216);
  std::string disk10252 = tvxtest::MakeSparseVmdk(dir_.Join("b.vmdk"), 10252);
  ASSERT_FALSE(disk9216.empty() || disk10252.empty()) << "qemu-img is needed";
  const std::string xp = "guestOS = \"winXPPro\"\n";
  const std::string disks =
      "scsi0.present = TRUE\nscsi0:0.present = TRUE\nscsi0:0.fileName = a.vmdk\n"
      "scsi0:1.present = TRUE\nscsi0:1.fileName = b.vmdk\n";
  struct Case {
    const char *name;
    std::string config;
    const char *guestText;  // null: read the (absent) extended config file
    uint32_t toolsVersion;
    int32_t mode;
    uint32_t status;
  } cases[] = {
      {"mode outside -1..2", xp, "", 10252, 5, TOOLS_STATUS_NOT_APPLICABLE},
      {"hypervisor guest in mode 2", "guestOS = zelcore\n", "", 10252, 2,
       TOOLS_STATUS_NOT_APPLICABLE},
      {"hypervisor guest in mode 1", "guestOS = zelcore\n", "", 12384, 1, TOOLS_STATUS_CURRENT},
      {"no tools", xp, "", 0, 0, TOOLS_STATUS_NOT_INSTALLED},
      {"not applicable number", xp, "", 0x7FFFFFFF, 0, TOOLS_STATUS_NOT_APPLICABLE},
      {"no guestOS at the default", "", "", 12384, 0, TOOLS_STATUS_CURRENT},
      {"no guestOS below the default", "", nullptr, 12383, 0, TOOLS_STATUS_TOO_OLD},
      {"XP at its maximum", xp, "", 10252, -1, TOOLS_STATUS_CURRENT},
      {"XP below its minimum", xp, "", 8383, 0, TOOLS_STATUS_TOO_OLD},
      {"XP, newest disk decides", xp + disks, "", 0xFFFFFFFF, 0, TOOLS_STATUS_CURRENT},
      {"disks named but absent", xp + "ide0:0.present = TRUE\nide0:0.fileName = x.vmdk\n", "",
       0xFFFFFFFF, 0, TOOLS_STATUS_NOT_INSTALLED},
  };
  for (const Case &c : cases) {
    Dictionary *config = Config(c.config);
    EXPECT_EQ(ToolsVersion_GetStatus(ConfigPath().c_str(), config, nullptr, c.guestText,
                                     c.toolsVersion, c.mode),
              c.status)
        << c.name;
  }
}

TEST_F(ToolsVersionStatus, DiskQueryFailureAndHardwareVersion) {
  Dictionary *config = Config("guestOS = winXPPro\n");
  // Without a configuration path the disks cannot be listed.
  EXPECT_EQ(
      ToolsVersion_GetStatus(nullptr, config, nullptr, "monolithic.version = 1\n", 0xFFFFFFFF, 0),
      TOOLS_STATUS_TOO_OLD);
  EXPECT_EQ(
      ToolsVersion_GetStatus(nullptr, config, nullptr,
                             "monolithic.version = 1\nvirtualHW.version = 21\n", 0xFFFFFFFF, 0),
      TOOLS_STATUS_UNKNOWN);
}

TEST_F(ToolsVersionStatus, SavedStatusIsPassedOnUnlessZeroOrUnknown) {
  Dictionary *config = Config("guestOS = ubuntu-64\n");
  struct Case {
    const char *status;
    uint32_t expected;
  } cases[] = {{"4", TOOLS_STATUS_SUPPORTED_NEW},
               {"9", TOOLS_STATUS_CURRENT},
               {"0", TOOLS_STATUS_CURRENT}};
  for (const Case &c : cases) {
    WriteFileOrDie(dir_.Join("vm.xml"),
                   std::string("<vm><update-agent-info><tools><monolithic status=\"") + c.status +
                       "\"/></tools></update-agent-info></vm>");
    EXPECT_EQ(ToolsVersion_GetStatus(ConfigPath().c_str(), config, nullptr, nullptr, 12384, 0),
              c.expected)
        << c.status;
  }
  struct Fault {
    const char *xml;  // null: no file
    const char *line;
  } faults[] = {
      {nullptr, "ToolsVersion: Failed to get xml buffer from extended config file.\n"},
      {"<vm>", "ToolsVersion: Error parsing xml from extended config file.\n"},
      {"<vm> </vm>", "ToolsVersion: Failed to find manifest content in extended config xml.\n"},
      {"<vm><tools-manifest/></vm>",
       "ToolsVersion: Failed to find manifest content in extended config xml.\n"},
  };
  for (const Fault &f : faults) {
    std::remove(dir_.Join("vm.xml").c_str());
    if (f.xml != nullptr) WriteFileOrDie(dir_.Join("vm.xml"), f.xml);
    tvxtest::LogCapture log;
    // Nothing read: a Linux guest between its limits.
    EXPECT_EQ(ToolsVersion_GetStatus(ConfigPath().c_str(), config, nullptr, nullptr, 12383, 0),
              TOOLS_STATUS_SUPPORTED_OLD);
    EXPECT_TRUE(log.Contains(f.line)) << log.All();
  }
}

TEST_F(ToolsVersionStatus, SaveMergesAndReadsBack) {
  Config("guestOS = ubuntu-64\n");
  const std::string cfg = ConfigPath();
  WriteFileOrDie(dir_.Join("vm.xml"),
                 "<vm><keep>x</keep><tools-manifest><old version=\"1\" installed=\"TRUE\"/>"
                 "</tools-manifest><update-agent-info><tools/><other/></update-agent-info></vm>");
  // Nothing to save: the file is not touched.
  EXPECT_TRUE(ToolsVersion_SaveXmlInfo(cfg.c_str(), "", nullptr, 5, 0));
  EXPECT_EQ(XPath("//old/@version"), "1:1");

  const char *agent =
      "<r><tools><monolithic guestVersion=\"12.1.0\" repoVersion=\"12.2.0\" status=\"2\" "
      "other=\"dropped\"/></tools><drivers><net status=\"3\"/></drivers></r>";
  ASSERT_TRUE(ToolsVersion_SaveXmlInfo(cfg.c_str(), agent, nullptr, -1, 3));
  EXPECT_EQ(XPath("//update-agent-info/other"), "0:");
  EXPECT_EQ(XPath("/vm/update-agent-info/tools/monolithic/@repoVersion"), "1:12.2.0");
  EXPECT_EQ(XPath("//monolithic/@other"), "0:");
  EXPECT_EQ(XPath("/vm/update-agent-info/drivers/net/@status"), "1:3");
  EXPECT_EQ(XPath("/vm/tools-manifest/monolithic/@version"), "1:12.1.0");
  EXPECT_EQ(XPath("//tools-manifest/*"), "1:");
  EXPECT_EQ(XPath("/vm/tools-install-info/*[2][self::updateCounter]"), "1:3");

  // A manifest replaces the agent's monolithic version; encoding is skipped.
  ASSERT_TRUE(ToolsVersion_SaveXmlInfo(
      cfg.c_str(), "null",
      "alpha.version = 1.2\nalpha.INSTALLED = TRUE\nalpha.encoding = UTF-8\nbare = 1\n", 0, 4));
  EXPECT_EQ(XPath("/vm/tools-manifest/alpha/@*"), "2:1.2|TRUE");
  EXPECT_EQ(XPath("//tools-manifest"), "1:");  // the agent's one is replaced
  EXPECT_EQ(XPath("/vm/tools-manifest/*[2][self::bare]"), "1:");
  EXPECT_EQ(XPath("/vm/tools-install-info/installError"), "1:0");
  EXPECT_EQ(XPath("/vm/update-agent-info/tools/monolithic/@status"), "1:2");

  // "no tools" forgets the saved status and the manifest.
  ASSERT_TRUE(ToolsVersion_SaveXmlInfo(cfg.c_str(), "no tools", nullptr, 0, 0));
  EXPECT_EQ(XPath("/vm/update-agent-info/tools"), "0:");
  EXPECT_EQ(XPath("/vm/update-agent-info/drivers"), "1:");
  EXPECT_EQ(XPath("/vm/tools-manifest"), "0:");
  EXPECT_EQ(XPath("/vm/keep"), "1:x");

  // Entries that XML cannot carry are skipped: written, they would make the
  // whole file unreadable.
  tvxtest::LogCapture log;
  ASSERT_TRUE(ToolsVersion_SaveXmlInfo(
      cfg.c_str(), nullptr, "a\xf0\x9a = 1\nb.version = \"\\x01\"\nc.version = 2\n", 0, 0));
  EXPECT_EQ(XPath("/vm/tools-manifest/*/@version"), "1:2");
  EXPECT_TRUE(
      log.Contains("ToolsVersion: Skipping manifest entry 'b.version': not representable "
                   "in XML.\n"));
}

TEST_F(ToolsVersionStatus, FailedSaveLeavesTheFileAsItWas) {
  Config("");
  const std::string cfg = ConfigPath();
  const std::string before = "<vm><tools-manifest><a version=\"1\"/></tools-manifest></vm>";
  WriteFileOrDie(dir_.Join("vm.xml"), before);
  {
    // (An unparsable agent report is the CLI test's case.)
    tvxtest::LogCapture log;
    EXPECT_FALSE(ToolsVersion_SaveXmlInfo(cfg.c_str(), nullptr, "a.version = \"1", 0, 1));
    EXPECT_TRUE(log.Contains("ToolsVersion: Error loading dictionary from manifest buffer"))
        << log.All();
    EXPECT_EQ(Xml(), before);
  }

  // The write itself fails after the temporary file has taken some bytes:
  // the file size limit stops it half way.
  struct rlimit old;
  ASSERT_EQ(getrlimit(RLIMIT_FSIZE, &old), 0);
  struct rlimit small = old;
  small.rlim_cur = 16;
  auto oldHandler = std::signal(SIGXFSZ, SIG_IGN);
  ASSERT_EQ(setrlimit(RLIMIT_FSIZE, &small), 0);
  tvxtest::LogCapture log;
  Bool saved = ToolsVersion_SaveXmlInfo(cfg.c_str(), nullptr, "b.version = 2\n", 0, 7);
  setrlimit(RLIMIT_FSIZE, &old);
  std::signal(SIGXFSZ, oldHandler);
  EXPECT_FALSE(saved);
  EXPECT_TRUE(log.Contains("ToolsVersion: Error writing to extended config file: errcode 27.\n"))
      << log.All();
  EXPECT_EQ(Xml(), before);
  size_t files = 0;
  for (const auto &e : std::filesystem::directory_iterator(dir_.Path())) files += e.exists();
  EXPECT_EQ(files, 2u);  // vm.tvx and vm.xml only: no temporary file left
}

}  // namespace
