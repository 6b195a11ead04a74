#include "tvx_floppy.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <set>
#include <string>

#include "support/fat_oracle.h"
#include "support/log_capture.h"
#include "support/run_argv.h"

namespace {

namespace fs = std::filesystem;
using tvxtest::Bytes;
using tvxtest::FatProblems;
using tvxtest::LogCapture;
using tvxtest::MtoolsNames;
using tvxtest::MtoolsRead;
using tvxtest::ReadFileOrDie;
using tvxtest::RunArgv;
using tvxtest::TempDir;
using tvxtest::TestFloppy;
using tvxtest::WriteFileOrDie;

// Sizes around the 512-byte block and the cluster, several clusters; short,
// mixed-case, long and non-ASCII names; a file replaced by a shorter one.
TEST(FloppyTransfer, FilesGoInAndComeOutByteForByte) {
  std::pair<std::string, size_t> files[] = {
      {"empty", 0},          {"f1.bin", 1},           {"TXTSETUP.OEM", 511},
      {"storePwd.ini", 512}, {"auto_i~1.cfg", 513},   {"Ünïcode name.txt", 5000},
      {std::string(200, 'L') + ".long", 1024},        {"TarvexToolsUpgrader.exe", 300000},
  };
  TempDir t;
  std::string img = t.Join("autoinst.flp"), host = t.Join("host"), back = t.Join("back");
  TestFloppy f;
  ASSERT_EQ(f.Open(img, true), FAT_OK);
  std::set<std::string> names;
  for (const auto &[name, n] : files) {
    WriteFileOrDie(host, Bytes(n, static_cast<int>(n)));
    ASSERT_TRUE(AddFileToFloppyImg(f.root, host.c_str(), name.c_str())) << name;
    names.insert(name);
  }
  // The entry stays, with its name, and the old contents leave no tail.
  files[7].second = 700;
  WriteFileOrDie(host, Bytes(700, 700));
  ASSERT_TRUE(AddFileToFloppyImg(f.root, host.c_str(), "tarvextoolsupgrader.EXE"));
  for (const auto &[name, n] : files) {
    ASSERT_TRUE(GetFileFromFloppyImg(f.root, name.c_str(), back.c_str())) << name;
    EXPECT_TRUE(ReadFileOrDie(back) == Bytes(n, static_cast<int>(n))) << name;
  }
  f.Close();
  EXPECT_EQ(ReadFileOrDie(img).size(), FAT_FLOPPY_SIZE);
  EXPECT_EQ(FatProblems(img), "");
  EXPECT_EQ(MtoolsNames(img), names);
  for (const auto &[name, n] : files) {
    std::string out;
    ASSERT_TRUE(MtoolsRead(img, name, &out)) << name;
    EXPECT_TRUE(out == Bytes(n, static_cast<int>(n))) << name;
  }
}

TEST(FloppyTransfer, FailuresAreLoggedAndLeaveWhatWasCopied) {
  TempDir t;
  std::string img = t.Join("autoinst.flp"), host = t.Join("host"), huge = t.Join("huge");
  WriteFileOrDie(host, "data");
  WriteFileOrDie(huge, Bytes(1500000, 3));
  TestFloppy f;
  ASSERT_EQ(f.Open(img, true), FAT_OK);
  ASSERT_TRUE(AddFileToFloppyImg(f.root, host.c_str(), "there.txt"));
  struct Case {
    const char *label;
    bool add;
    std::string from, to;
    std::string log;
  } cases[] = {
      {"missing host file", true, t.Join("absent"), "new.txt",
       "AddFileToFloppyImg: FileIO_Open failed, error: 6\n"},
      {"name FAT cannot hold", true, host, "a:b", "AddFileToFloppyImg: FAT_CreateFile failed, error: 7\n"},
      {"missing image file", false, "absent.txt", t.Join("out"),
       "GetFileFromFloppyImg: FAT_OpenFile failed, error: 4\n"},
      {"host folder missing", false, "there.txt", t.Join("no/out"),
       "GetFileFromFloppyImg: FileIO_Open failed, error: 6\n"},
      // Larger than the room left: the entry stays; how much of it fits is the FAT test's.
      {"no room left", true, huge, "huge.bin", "AddFileToFloppyImg: FAT_WriteFile failed, error: 6\n"},
  };
  for (const Case &c : cases) {
    LogCapture log;
    Bool ok = c.add ? AddFileToFloppyImg(f.root, c.from.c_str(), c.to.c_str())
                    : GetFileFromFloppyImg(f.root, c.from.c_str(), c.to.c_str());
    EXPECT_FALSE(ok) << c.label;
    EXPECT_EQ(log.All(), c.log) << c.label;
  }
  f.Close();
  EXPECT_EQ(FatProblems(img), "");
  EXPECT_EQ(MtoolsNames(img), (std::set<std::string>{"there.txt", "huge.bin"}));
}

// CRLF lines, a key in the wrong letter case and two drivers: the first
// match wins.
const std::string kTxtsetup =
    "[Disks]\r\nd1 = \"LSI Logic Driver Disk\",\\symmpi.sys,\\\r\n"
    "[Defaults]\r\nscsi = SYMMPI_32\r\n"
    "[scsi]\r\nsymmpi_32 = \"wrong case\"\r\n"
    "SYMMPI_32 = \"LSI Logic PCI Fusion-MPT Driver (XP 32-bit)\"\r\n"
    "LSI_SAS_32 = \"LSI SAS\"\r\n"
    "[Files.scsi.SYMMPI_32]\r\ndriver = d1,symmpi.sys,SYMMPI\r\n";
const std::string kEntry = "\"LSI Logic PCI Fusion-MPT Driver (XP 32-bit)\"=OEM\n";
const std::string kSif = "[Unattended]\nOemPreinstall=No\n";

std::set<std::string> Listing(const std::string &dir) {
  std::set<std::string> names;
  for (const auto &e : fs::directory_iterator(dir)) names.insert(e.path().filename().string());
  return names;
}

class WindowsFloppy : public ::testing::Test {
 protected:
  void SetUp() override {
    fs::create_directories(cfg_);
    fs::create_directories(res_);
    fs::create_directories(t_.Join("iso/drivers/scsi"));
    fs::create_directories(t_.Join("iso/upgrader"));
    WriteFileOrDie(res_ + "/unattend.cmd", "@echo off\r\n");
    WriteFileOrDie(res_ + "/storePwd.exe", Bytes(3000, 1));
    WriteFileOrDie(t_.Join("iso/drivers/scsi/txtsetup.oem"), kTxtsetup);
    WriteFileOrDie(t_.Join("iso/drivers/scsi/symmpi.sys"), Bytes(40000, 2));
    WriteFileOrDie(t_.Join("iso/upgrader/TarvexToolsUpgrader.exe"), Bytes(70000, 3));
    std::string out;
    ASSERT_EQ(RunArgv({"genisoimage", "-quiet", "-J", "-o", iso_, t_.Join("iso")}, &out), 0) << out;
    // The product's driver floppy, upper-case names and a folder as others write them.
    std::string flp = res_ + "/tvxscsi.flp";
    ASSERT_EQ(RunArgv({"mkfs.fat", "-C", flp, "1440"}, &out), 0) << out;
    ASSERT_TRUE(tvxtest::MtoolsWrite(flp, "TXTSETUP.OEM", kTxtsetup));
    ASSERT_TRUE(tvxtest::MtoolsWrite(flp, "SYMMPI.SYS", Bytes(40000, 2)));
    ASSERT_EQ(RunArgv({"mmd", "-i", flp, "::/I386"}, &out), 0) << out;
    Answers(true);
  }
  void Answers(bool storePwd) {
    WriteFileOrDie(cfg_ + "/winnt.sif", kSif);
    WriteFileOrDie(cfg_ + "/autoun~0.xml", "<unattend/>\n");
    if (storePwd) WriteFileOrDie(cfg_ + "/storePwd.ini", "[Logon]\n");
  }
  std::string FloppyFile(const std::string &name) {
    std::string out;
    EXPECT_TRUE(MtoolsRead(flp_, name, &out)) << name;
    return out;
  }

  tvxtest::TempDir t_;
  std::string cfg_ = t_.Join("cfg"), res_ = t_.Join("res"), iso_ = t_.Join("tools.iso");
  std::string flp_ = cfg_ + "/autoinst.flp";
};

TEST_F(WindowsFloppy, DriverSourcesAndBaseFloppy) {
  std::string hostDrivers = t_.Join("iso/drivers/scsi"), base = t_.Join("base.flp"), out;
  ASSERT_EQ(RunArgv({"mkfs.fat", "-C", base, "1440"}, &out), 0) << out;
  ASSERT_TRUE(tvxtest::MtoolsWrite(base, "README.TXT", "base"));
  const std::set<std::string> answers = {"winnt.sif", "autoun~0.xml", "storePwd.ini",
                                         "storePwd.exe", "unattend.cmd"};
  auto with = [&answers](std::set<std::string> more) {
    more.insert(answers.begin(), answers.end());
    return more;
  };
  struct Case {
    const char *label, *base, *iso, *scsi, *upgrader;
    std::set<std::string> names;
    bool oem;
  } cases[] = {
      {"tools ISO: drivers and upgrader", nullptr, iso_.c_str(), "/drivers/scsi", "upgrader",
       with({"upgrader.exe", "symmpi.sys", "txtsetup.oem"}), true},
      {"tools ISO missing: the driver floppy", nullptr, "/no/tools.iso", "/drivers/scsi", "upgrader",
       with({"symmpi.sys", "txtsetup.oem"}), true},
      {"host folder", nullptr, nullptr, hostDrivers.c_str(), nullptr,
       with({"symmpi.sys", "txtsetup.oem"}), true},
      {"base floppy kept", base.c_str(), nullptr, nullptr, nullptr, with({"README.TXT"}), false},
  };
  for (const Case &c : cases) {
    Answers(true);
    LogCapture log;
    EXPECT_TRUE(AutoInstall_MakeFloppyImg(c.base, cfg_.c_str(), c.iso, c.scsi, c.upgrader, res_.c_str()))
        << c.label << "\n" << log.All();
    // Only the tolerated failure of the missing upgrader is logged.
    EXPECT_FALSE(log.Contains("AutoInstall_MakeFloppyImg")) << c.label << "\n" << log.All();
    EXPECT_EQ(FatProblems(flp_), "") << c.label;
    EXPECT_EQ(MtoolsNames(flp_), c.names) << c.label;
    EXPECT_EQ(FloppyFile("winnt.sif"),
              kSif + (c.oem ? "[OEMBootFiles]\nsymmpi.sys\ntxtsetup.oem\n[MassStorageDrivers]\n" + kEntry : ""))
        << c.label;
    if (c.oem) {
      EXPECT_TRUE(FloppyFile("symmpi.sys") == Bytes(40000, 2)) << c.label;
    }
    if (c.names.count("upgrader.exe") != 0) {
      EXPECT_TRUE(FloppyFile("upgrader.exe") == Bytes(70000, 3)) << c.label;
    }
    // The answer files are consumed; the image is owner-only.
    EXPECT_EQ(Listing(cfg_), std::set<std::string>{"autoinst.flp"}) << c.label;
    struct stat st{};
    ASSERT_EQ(stat(flp_.c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0600u) << c.label;
  }
  // Adding a file never creates the image; it goes into the one made.
  std::string extra = t_.Join("extra.txt");
  WriteFileOrDie(extra, Bytes(600, 4));
  EXPECT_TRUE(AutoInstall_AddFileToFloppyImg(extra.c_str(), "Extra File.txt", cfg_.c_str()));
  EXPECT_EQ(FatProblems(flp_), "");
  EXPECT_TRUE(FloppyFile("Extra File.txt") == Bytes(600, 4));
  fs::remove(flp_);
  EXPECT_FALSE(AutoInstall_AddFileToFloppyImg(extra.c_str(), "extra.txt", cfg_.c_str()));
  EXPECT_FALSE(fs::exists(flp_));
  // The caller's driver folder is left as it was.
  EXPECT_EQ(Listing(hostDrivers), (std::set<std::string>{"symmpi.sys", "txtsetup.oem"}));
  EXPECT_EQ(ReadFileOrDie(base).size(), 1474560u);
}

TEST_F(WindowsFloppy, FailuresSayWhyAndLeaveOnlyTheImage) {
  std::string notIso = t_.Join("bad.iso"), empty = t_.Join("empty"), notFat = t_.Join("bad.flp");
  WriteFileOrDie(notIso, std::string(40000, 'x'));
  WriteFileOrDie(notFat, std::string(4096, 'x'));
  fs::create_directories(empty);
  const std::string fn = "AutoInstall_MakeFloppyImg: ";
  struct Case {
    const char *label, *base, *iso, *scsi, *upgrader;
    std::string log;
  } cases[] = {
      {"tools ISO unreadable", nullptr, notIso.c_str(), "/drivers/scsi", nullptr,
       fn + "Iso9660_Open res=6 toolsIsoPath=\"" + notIso + "\"\n"},
      {"driver folder missing from the ISO", nullptr, iso_.c_str(), "/drivers/none", nullptr,
       fn + "Iso9660_Extract res=3 scsiDriverDir=\"/drivers/none\"tempdir=\"" + cfg_ + "/scsi\"\n"},
      {"empty driver folder", nullptr, nullptr, empty.c_str(), nullptr,
       fn + "File_ListDirectory nf=0 tempdir=\"" + empty + "\"\n"},
      {"upgrader missing from the ISO", nullptr, iso_.c_str(), nullptr, "/drivers",
       fn + "Iso9660_Extract res=3 upgraderIsoLocation=\"/drivers/TarvexToolsUpgrader.exe\"guestConfigDir=\"" +
           cfg_ + "\"\n"},
      {"base floppy not FAT", notFat.c_str(), nullptr, nullptr, nullptr,
       fn + "FAT_OpenVolume err=2 floppyImageFilePath =\"" + flp_ + "\"\n"},
  };
  for (const Case &c : cases) {
    Answers(true);
    LogCapture log;
    EXPECT_FALSE(AutoInstall_MakeFloppyImg(c.base, cfg_.c_str(), c.iso, c.scsi, c.upgrader, res_.c_str()))
        << c.label;
    EXPECT_EQ(log.All(), c.log) << c.label;
    EXPECT_EQ(Listing(cfg_), std::set<std::string>{"autoinst.flp"}) << c.label;
  }
  EXPECT_TRUE(fs::is_directory(empty));  // the caller's, even when empty

  // Missing helpers from the product's folder.
  fs::remove(res_ + "/unattend.cmd");
  Answers(false);
  LogCapture log;
  EXPECT_FALSE(AutoInstall_MakeFloppyImg(nullptr, cfg_.c_str(), nullptr, nullptr, nullptr, res_.c_str()));
  EXPECT_EQ(log.All(), "AddFileToFloppyImg: FileIO_Open failed, error: 6\n" + fn +
                           "AddFileToFloppyImg UNATTENDED_CMD=\"" + res_ + "/unattend.cmd\"\n");
  EXPECT_EQ(MtoolsNames(flp_), (std::set<std::string>{"winnt.sif", "autoun~0.xml"}));
  EXPECT_FALSE(AutoInstall_MakeFloppyImg(nullptr, cfg_.c_str(), nullptr, nullptr, nullptr, nullptr));
}

TEST_F(WindowsFloppy, OemDriverEntry) {
  struct Case {
    const char *label;
    std::string oem, entry;
    bool warns;
  } cases[] = {
      {"last line without newline", "[scsi]\nTVXSCSI = \"Tarvex SCSI\"", "\"Tarvex SCSI\"=OEM\n", false},
      {"name after the =", "[Defaults]\nscsi = LSI_SAS_32 \"x\"\n", "", true},
      {"one quote only", "LSI_SAS_32 = \"LSI SAS\nLSI_SCSI_32 = \"LSI SCSI\"\n", "\"LSI SCSI\"=OEM\n", false},
      {"empty file", "", "", false},
  };
  for (const Case &c : cases) {
    std::string oem = t_.Join("txtsetup.oem"), sif = t_.Join("winnt.sif");
    WriteFileOrDie(oem, c.oem);
    WriteFileOrDie(sif, kSif);
    LogCapture log;
    WriteOEMDriverInfo(oem.c_str(), sif.c_str());
    EXPECT_EQ(ReadFileOrDie(sif), kSif + (c.entry.empty() ? "" : "[MassStorageDrivers]\n" + c.entry))
        << c.label;
    EXPECT_EQ(log.All(), c.warns ? "WriteOEMDriverInfo: Failed to detect the type of driver in " + oem + "\n" : "")
        << c.label;
  }
}

}  // namespace
