#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <string>

#include "lib/guestInstall/autoinstall_linux_media_internal.h"
#include "support/fat_oracle.h"
#include "support/log_capture.h"
#include "support/run_argv.h"
#include "tvx_autoinstall_linux_media.h"

namespace fs = std::filesystem;
using tvx::autoinstall::BootEntry;
using tvx::autoinstall::parseIsolinuxConfig;
using tvxtest::LogCapture;
using tvxtest::ReadFileOrDie;
using tvxtest::TempDir;

namespace {

void Put(const std::string &path, const std::string &text) {
  fs::create_directories(fs::path(path).parent_path());
  tvxtest::WriteFileOrDie(path, text);
}

struct ParseCase {
  const char *name;
  const char *text;
  bool ok;
  const char *kernel, *initrd, *append;
};

TEST(IsolinuxConfig, FirstCompleteEntry) {
  const ParseCase cases[] = {
      {"lines before the first label are ignored",
       "kernel early\nappend initrd=e.img x\nlabel a\n kernel k\n append initrd=i y\n", true,
       "k", "i", "y "},
      {"entry without initrd skipped",
       "label a\n kernel k1\n append quiet\nlabel b\n kernel k2\n append initrd=i2 b\n", true,
       "k2", "i2", "b "},
      {"capital keywords", "LABEL A\n  KERNEL /images/vmlinuz\n  APPEND INITRD=/images/i.img Q\n",
       true, "/images/vmlinuz", "/images/i.img", "Q "},
      {"tabs and runs of blanks",
       "label a\n\tkernel\tvmlinuz  \n\tappend   initrd=i.img \t a   b\t\n", true, "vmlinuz",
       "i.img", "a b "},
      {"CRLF line ends", "label a\r\n kernel k\r\n append initrd=i x\r\r\n", true, "k", "i", "x "},
      {"last initrd wins", "label a\n kernel k\n append initrd=one x initrd=two\n", true, "k",
       "two", "x "},
      {"kernel after append completes at the next label",
       "label a\n append initrd=i x\n kernel k1\n kernel k2\nlabel b\n kernel k3\n append initrd=j\n",
       true, "k2", "i", "x "},
      {"append after kernel ends the parse at once",
       "label a\n kernel k\n append initrd=i x\n append initrd=other y\n", true, "k", "i", "x "},
      {"an incomplete entry leaves nothing to the next",
       "label a\n kernel k1\nlabel b\n append initrd=i x\n", false, "", "", ""},
      {"indented label is not a label", "  label a\n kernel k\n append initrd=i\n", false, "", "",
       ""},
      {"keyword without value", "label a\n kernel \n append initrd=i\n", false, "", "", ""},
  };
  for (const ParseCase &c : cases) {
    BootEntry e;
    EXPECT_EQ(parseIsolinuxConfig(c.text, &e), c.ok) << c.name;
    if (!c.ok) continue;
    EXPECT_EQ(e.kernel, c.kernel) << c.name;
    EXPECT_EQ(e.initrd, c.initrd) << c.name;
    EXPECT_EQ(e.append, c.append) << c.name;
  }
}

TEST(IsolinuxConfig, LongAppendKeepsWholeArguments) {
  std::string line = "label a\n kernel k\n append";
  for (int i = 0; i < 70; ++i) line += " arg" + std::to_string(1000 + i);  // 8 bytes kept each
  line += " initrd=late.img\n";
  BootEntry e;
  ASSERT_TRUE(parseIsolinuxConfig(line, &e));
  EXPECT_EQ(e.initrd, "late.img");
  EXPECT_EQ(e.append.size(), 63u * 8) << "whole arguments up to 511 bytes: " << e.append;
}

TEST(IsolinuxConfig, RemoveAskMethodAndLoaderGeneration) {
  // Whole arguments only; the rescan test pins the removal from a real line.
  std::string ask = "askmethodx  askmethod";
  tvx::autoinstall::removeAskMethod(&ask);
  EXPECT_EQ(ask, "askmethodx ");
  const std::pair<std::string, bool> loaders[] = {
      {"ISOLINUX 5.10 ", true},
      {"isolinux: ISOLINUX 4.07 ", false},
      {"ISOLINUX x ISOLINUX 10.1", true},
      {"no banner", false},
  };
  for (const auto &[bytes, needs] : loaders) {
    EXPECT_EQ(tvx::autoinstall::NeedsLdlinux(bytes), needs) << bytes;
  }
}

class ScanDisk : public ::testing::Test {
 protected:
  void SetUp() override { Seed(src_); }
  static void Seed(const TempDir &src) {
    Put(src.Join("isolinux/isolinux.cfg"),
        "label linux\n kernel vmlinuz\n append initrd=initrd.img askmethod text\n");
    Put(src.Join("isolinux/vmlinuz"), "kernel bytes");
    Put(src.Join("isolinux/initrd.img"), "ramdisk bytes");
    Put(src.Join("isolinux/isolinux.bin"), "loader without banner");
  }
  bool Scan(const char *guest = "centos7-64", uint32_t version = 0, const char *bin = nullptr) {
    return AutoInstall_ScanDisk(src_.Path().c_str(), out_.Path().c_str(), guest, version, bin);
  }
  std::string Out(const char *name) { return out_.Join(std::string("isolinux/") + name); }
  TempDir src_, out_;
};

TEST_F(ScanDisk, RescanReplacesConfigWithoutTailOrLink) {
  Put(Out("isolinux.cfg"), std::string(8000, '#'));
  std::string elsewhere = out_.Join("victim");
  Put(elsewhere, "keep");
  fs::remove(Out("vmlinuz"));
  fs::create_symlink(elsewhere, Out("vmlinuz"));
  ASSERT_TRUE(Scan());
  EXPECT_EQ(ReadFileOrDie(Out("isolinux.cfg")),
            "default linux\nprompt 0\ntimeout 1\n\nlabel linux\n\tkernel vmlinuz\n\tappend "
            "initrd=initrd.img text  ks=cdrom:/ks.cfg\n");
  EXPECT_EQ(ReadFileOrDie(elsewhere), "keep");
  EXPECT_FALSE(fs::is_symlink(Out("vmlinuz")));
  EXPECT_EQ(ReadFileOrDie(Out("vmlinuz")), "kernel bytes");
}

TEST_F(ScanDisk, EmptyIsolinuxCfgFallsBackToAnotherCfg) {
  Put(src_.Join("isolinux/isolinux.cfg"), "");
  Put(src_.Join("isolinux/a.CFG"), "label x\n kernel /boot/k\n append initrd=/boot/i x\n");
  Put(src_.Join("boot/k"), "K");
  Put(src_.Join("boot/i"), "I");
  LogCapture log;
  ASSERT_TRUE(Scan("ubuntu-64"));
  EXPECT_EQ(log.All(), "");
  EXPECT_EQ(ReadFileOrDie(Out("k")), "K");
  EXPECT_NE(ReadFileOrDie(Out("isolinux.cfg")).find("append initrd=i x  debian-installer/"),
            std::string::npos);
}

struct FailureCase {
  const char *name;
  void (*break_it)(const std::string &src);
  uint32_t version;
  const char *log;
};

TEST_F(ScanDisk, FailuresSayWhyAndWriteNoConfig) {
  const FailureCase cases[] = {
      {"no configuration", [](const std::string &s) { fs::remove(s + "/isolinux/isolinux.cfg"); },
       0, "parseCfgFilesInDisk: findFileInDisk failed isolinux.cfg in \""},
      {"nothing parses",
       [](const std::string &s) { Put(s + "/isolinux/isolinux.cfg", "label a\n kernel k\n"); }, 0,
       "AutoInstall_ScanDisk: parseIsolinuxConfig failed"},
      {"kernel missing", [](const std::string &s) { fs::remove(s + "/isolinux/vmlinuz"); }, 0,
       "AutoInstall_ScanDisk: File_Copy failed from=\""},
      {"ubuntu defaults without casper",
       [](const std::string &s) { fs::remove(s + "/isolinux/isolinux.cfg"); },
       GUESS_VERSION_UBUNTU_2010_OR_HIGHER, "/casper/vmlinuz\" to=\""},
  };
  for (const FailureCase &c : cases) {
    TempDir src, out;
    Seed(src);
    c.break_it(src.Path());
    LogCapture log;
    EXPECT_FALSE(AutoInstall_ScanDisk(src.Path().c_str(), out.Path().c_str(), "centos7-64",
                                      c.version, nullptr))
        << c.name;
    EXPECT_TRUE(log.Contains(c.log)) << c.name << ": " << log.All();
    EXPECT_FALSE(fs::exists(out.Join("isolinux/isolinux.cfg"))) << c.name;
  }
}

TEST_F(ScanDisk, LoaderThatNeedsLdlinuxBringsItOrFails) {
  Put(src_.Join("isolinux/isolinux.bin"), std::string("ISOLINUX 6.04 2020", 18));
  EXPECT_FALSE(Scan()) << "a tree without ldlinux.c32 cannot boot";
  Put(src_.Join("isolinux/ldlinux.c32"), "ld");
  ASSERT_TRUE(Scan());
  EXPECT_EQ(ReadFileOrDie(Out("ldlinux.c32")), "ld");
}

TEST(MasterISO, PathsAreNeverShellText) {
  const char *mkisofs = "/usr/bin/genisoimage";
  TempDir base;
  // Each of these would run `touch` if the path went through a shell.
  std::string dir = base.Join("a \"b\" $(touch x1) `touch x2` \\ 'c'");
  std::string tree = dir + "/-tree", out = dir + "/out $(touch x3)";
  Put(tree + "/isolinux/isolinux.bin", std::string(2048, '\0'));
  Put(tree + "/ks.cfg", "ks");
  fs::create_directories(out);
  std::string cwd = fs::current_path();
  fs::current_path(base.Path());
  EXPECT_TRUE(AutoInstall_MasterISO(tree.c_str(), mkisofs, out.c_str()));
  fs::current_path(cwd);
  for (const auto &e : fs::recursive_directory_iterator(base.Path())) {
    EXPECT_EQ(e.path().filename().string().rfind("x", 0), std::string::npos) << e.path();
  }
  EXPECT_FALSE(fs::exists(tree)) << "the tree is consumed";
  std::string info;
  EXPECT_EQ(tvxtest::RunArgv({"isoinfo", "-d", "-i", out + "/autoinst.iso"}, &info), 0);
  EXPECT_NE(info.find("El Torito"), std::string::npos) << info;
}

TEST(MasterISO, FailuresAndWhatStays) {
  TempDir base;
  std::string tree = base.Join("tree");
  Put(tree + "/ks.cfg", "ks");
  EXPECT_FALSE(AutoInstall_MasterISO(tree.c_str(), nullptr, base.Path().c_str()));
  EXPECT_TRUE(fs::exists(tree)) << "a refused call leaves the tree";
  EXPECT_FALSE(AutoInstall_MasterISO(tree.c_str(), "/bin/false", base.Path().c_str()));
  EXPECT_FALSE(fs::exists(tree)) << "the tree goes whatever the tool did";
  Put(tree + "/ks.cfg", "ks");
  EXPECT_FALSE(AutoInstall_MasterISO(tree.c_str(), base.Join("no-such-tool").c_str(),
                                     base.Path().c_str()));
}

TEST(AddToolsLinux, StopsAtTheFirstMissingFile) {
  TempDir tools, dest;
  Put(tools.Join("tarvex-tools-upgrader-32"), "32");
  Put(tools.Join("run_upgrader.sh"), "sh");
  EXPECT_FALSE(AutoInstall_AddTools_Linux(dest.Path().c_str(), tools.Path().c_str()));
  EXPECT_EQ(ReadFileOrDie(dest.Join("upgra32")), "32");
  EXPECT_FALSE(fs::exists(dest.Join("upgrade.sh")));
  Put(tools.Join("tarvex-tools-upgrader-64"), "64");
  EXPECT_TRUE(AutoInstall_AddTools_Linux(dest.Path().c_str(), tools.Path().c_str()));
  EXPECT_EQ(ReadFileOrDie(dest.Join("upgrade.sh")), "sh");
}

// A template floppy as a distribution ships it: already holding a driver.
void MakeTemplate(const std::string &path) {
  tvxtest::TestFloppy f;
  ASSERT_EQ(f.Open(path, true), 0u);
  f.Close();
  ASSERT_TRUE(tvxtest::MtoolsWrite(path, "driver.img", "driver bytes"));
}

struct FloppyCase {
  const char *guestOS;
  const char *answerPath;  // where the answer file was prepared, "" for none
  const char *nameOnFloppy;
  bool fromTemplate;
  bool ok, image;
  const char *log;
};

TEST(MakeFloppyImgLinux, AnswerFileOnTheGuestsFloppy) {
  const FloppyCase cases[] = {
      {"sles10-64", "autoinst.xml", "autoinst.xml", true, true, true, ""},
      {"mandriva", "auto_i~1.cfg", "auto_i~1.cfg", true, true, true, ""},
      {"centos7-64", "ks.cfg", "", false, true, false, ""},
      {"sles15-64", "autoinst.xml", "", false, true, false, ""},
      {"ubuntu-64", "preseed.cfg", "", false, false, false, ""},  // not in custom/
      {"mandriva", "auto_i~1.cfg", "", false, false, false,
       "AutoInstall_MakeFloppyImg_Linux: !File_Exists failed templatePath=\""},
  };
  for (const FloppyCase &c : cases) {
    TempDir answers, floppies, templates;
    std::string answer = std::string("answer for ") + c.guestOS;
    if (*c.answerPath != '\0') Put(answers.Join(c.answerPath), answer);
    if (c.fromTemplate) {
      MakeTemplate(templates.Join("suse.flp"));
      MakeTemplate(templates.Join("mandriva.flp"));
    }
    tvxtest::LogCapture log;
    std::string label = std::string(c.guestOS) + " " + c.answerPath;
    EXPECT_EQ(AutoInstall_MakeFloppyImg_Linux(answers.Path().c_str(), floppies.Path().c_str(),
                                              templates.Path().c_str(), c.guestOS),
              c.ok)
        << label << log.All();
    if (*c.log != '\0') {
      EXPECT_TRUE(log.Contains(c.log)) << label << log.All();
    } else {
      EXPECT_EQ(log.All(), "") << label;
    }
    std::string image = floppies.Join("autoinst.flp");
    ASSERT_EQ(fs::exists(image), c.image) << label;
    if (!c.image) continue;
    EXPECT_EQ(tvxtest::FatProblems(image), "") << label;
    std::string data;
    ASSERT_TRUE(tvxtest::MtoolsRead(image, c.nameOnFloppy, &data)) << label;
    EXPECT_EQ(data, answer) << label;
    EXPECT_EQ(tvxtest::MtoolsNames(image).count("driver.img"), c.fromTemplate ? 1u : 0u) << label;
  }
  EXPECT_FALSE(AutoInstall_NeedsFloppy_Linux(nullptr));
}

}  // namespace
