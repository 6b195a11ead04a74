#include <gtest/gtest.h>

#include <filesystem>
#include <set>
#include <string>

#include "support/fat_oracle.h"
#include "support/log_capture.h"
#include "tvx_autoinstall_linux_media.h"

namespace fs = std::filesystem;
using tvxtest::TempDir;

namespace {

void Put(const std::string &path, const std::string &text) {
  fs::create_directories(fs::path(path).parent_path());
  tvxtest::WriteFileOrDie(path, text);
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
      {"sles11-64", "", "", true, false, false, ""},
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
