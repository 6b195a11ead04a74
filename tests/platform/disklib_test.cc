#include "platform/disklib.h"
#include "platform/snapshot.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>
#include <vector>

#include "support/log_capture.h"
#include "support/run_argv.h"

namespace {

using tvxtest::ReadFileOrDie;
using tvxtest::TempDir;
using tvxtest::WriteFileOrDie;

std::string DbGet(const std::string &path, const char *key, DiskLibError *rc) {
  DiskLibHandle *h = nullptr;
  *rc = DiskLib_Open(path.c_str(), 7, 0, &h);
  if (*rc != DISKLIB_OK) return "";
  char *v = nullptr;
  *rc = DiskLib_DBGet(h, key, &v);
  std::string out = v != nullptr ? v : "";
  std::free(v);
  DiskLib_Close(h);
  return out;
}

// Sparse disks are read by the tools status tests, which must find the
// newer of two disks' tools versions.
TEST(DiskLib, ReadsTheDiskDatabaseOfADescriptorDisk) {
  TempDir t;
  DiskLibError rc;
  std::string desc = t.Join("flat.vmdk");
  WriteFileOrDie(desc,
                 "# Disk DescriptorFile\r\nversion=1\r\ncreateType=\"monolithicFlat\"\r\n"
                 "RW 2048 FLAT \"flat-flat.vmdk\" 0\r\n# The Disk Data Base\r\n"
                 "ddb.toolsVersion = \"12384\"\r\n  ddb.uuid = 60 00 C2 9a  \r\nddb.empty =\r\n");
  EXPECT_EQ(DbGet(desc, "toolsVersion", &rc), "12384");
  EXPECT_EQ(DbGet(desc, "uuid", &rc), "60 00 C2 9a");
  EXPECT_EQ(DbGet(desc, "ddb.EMPTY", &rc), "");
  EXPECT_EQ(rc, DISKLIB_OK);
  DbGet(desc, "noSuchKey", &rc);
  EXPECT_EQ(rc, DISKLIB_ERR_NOT_FOUND);
}

TEST(DiskLib, RefusesDamagedOrForeignFiles) {
  TempDir t;
  std::string sparse = tvxtest::MakeSparseVmdk(t.Join("base.vmdk"), 1);
  ASSERT_FALSE(sparse.empty());
  std::string good = ReadFileOrDie(sparse);
  auto patched = [&](size_t offset, unsigned char byte) {
    std::string b = good;
    b[offset] = static_cast<char>(byte);
    return b;
  };
  struct Case {
    const char *label;
    std::string bytes;
    DiskLibError want;
  } cases[] = {
      {"truncated header", good.substr(0, 100), DISKLIB_ERR_FORMAT},
      {"descriptor offset 0", patched(28, 0), DISKLIB_ERR_FORMAT},
      {"descriptor past the end", patched(35, 0x7f), DISKLIB_ERR_FORMAT},
      {"huge descriptor", patched(38, 0x10), DISKLIB_ERR_FORMAT},
      {"cut before descriptor", good.substr(0, 600), DISKLIB_ERR_FORMAT},
      {"empty", "", DISKLIB_ERR_FORMAT},
  };
  for (const auto &c : cases) {
    std::string path = t.Join("case.vmdk");
    WriteFileOrDie(path, c.bytes);
    DiskLibHandle *h = reinterpret_cast<DiskLibHandle *>(1);
    EXPECT_EQ(DiskLib_Open(path.c_str(), 7, 0, &h), c.want) << c.label;
    EXPECT_EQ(h, nullptr) << c.label;
  }
  DiskLibHandle *h = nullptr;
  EXPECT_EQ(DiskLib_Open(t.Join("absent.vmdk").c_str(), 7, 0, &h), DISKLIB_ERR_OPEN);
}

std::vector<std::string> Texts(SnapshotStringList *l) {
  std::vector<std::string> out;
  for (; l != nullptr; l = l->next) out.emplace_back(l->text);
  return out;
}

TEST(Snapshot, ListsPresentDisksInConfigurationOrder) {
  const char config[] =
      "scsi0.present = \"TRUE\"\n"
      "scsi0:0.present = \"TRUE\"\n"
      "scsi0:0.fileName = \"disk.vmdk\"\n"
      "ide1:0.present = \"TRUE\"\n"
      "ide1:0.deviceType = \"cdrom-image\"\n"
      "ide1:0.fileName = \"/isos/ubuntu.vmdk\"\n"
      "sata0:1.present = \"FALSE\"\n"
      "sata0:1.fileName = \"off.vmdk\"\n"
      "scsi1.present = \"FALSE\"\n"
      "scsi1:0.present = \"TRUE\"\n"
      "scsi1:0.fileName = \"controller-off.vmdk\"\n"
      "nvme0:0.present = \"TRUE\"\n"
      "nvme0:0.fileName = \"/abs/data.VMDK\"\n"
      "ide0:0.present = \"TRUE\"\n"
      "ide0:0.fileName = \"notes.txt\"\n"
      "sata0:0.present = \"TRUE\"\n"
      "sata0:0.deviceType = \"ata-hardDisk\"\n"
      "sata0:0.fileName = \"sub/second.vmdk\"\n";
  Dictionary *d = Dictionary_Create();
  ASSERT_TRUE(Dictionary_LoadFromBuffer(d, config, sizeof config - 1));
  SnapshotStringList *devices = nullptr, *disks = nullptr;
  ASSERT_EQ(Snapshot_GetCurrentDisksCfgDict("/vms/a/a.tvxx", d, &devices, &disks, 0), SNAPSHOT_OK);
  EXPECT_EQ(Texts(devices), (std::vector<std::string>{"scsi0:0", "nvme0:0", "sata0:0"}));
  EXPECT_EQ(Texts(disks),
            (std::vector<std::string>{"/vms/a/disk.vmdk", "/abs/data.VMDK", "/vms/a/sub/second.vmdk"}));
  Snapshot_FreeStringList(devices);
  Snapshot_FreeStringList(disks);

  Dictionary *empty = Dictionary_Create();
  ASSERT_EQ(Snapshot_GetCurrentDisksCfgDict("a.tvxx", empty, &devices, &disks, 0), SNAPSHOT_OK);
  EXPECT_EQ(disks, nullptr);
  EXPECT_EQ(Snapshot_GetCurrentDisksCfgDict(nullptr, d, &devices, &disks, 0), SNAPSHOT_ERR_ARGS);
  Dictionary_Free(empty);
  Dictionary_Free(d);
}

}  // namespace
