#include "lib/guestInstall/autoinstall_windows_xml.h"

#include <gtest/gtest.h>
#include <libxml/parser.h>

#include <string>

#include "support/unattend_xml.h"
#include "platform/xml_unique.h"
#include "support/log_capture.h"

using namespace tvx::autoinstall;

namespace {

using tvxtest::UnattendXml;

// A small unattend document: one first-logon command numbered `lastOrder`,
// two partitions, and the user-name elements.
std::string Doc(const std::string &lastOrder = "3", bool declareWcm = true) {
  return std::string("<?xml version=\"1.0\" encoding=\"utf-8\"?>\n") +
         "<unattend xmlns=\"urn:schemas-microsoft-com:unattend\"" +
         (declareWcm ? " xmlns:wcm=\"http://schemas.microsoft.com/WMIConfig/2002/State\"" : "") +
         ">\n"
         "  <settings pass=\"oobeSystem\">\n"
         "    <component name=\"Microsoft-Windows-Shell-Setup\">\n"
         "      <AutoLogon><Username>old</Username></AutoLogon>\n"
         "      <FirstLogonCommands>\n"
         "        <SynchronousCommand><CommandLine>first</CommandLine><Order>1</Order>"
         "</SynchronousCommand>\n"
         "        <SynchronousCommand><CommandLine>last</CommandLine><Order>" +
         lastOrder +
         "</Order></SynchronousCommand>\n"
         "      </FirstLogonCommands>\n"
         "    </component>\n"
         "  </settings>\n"
         "  <settings pass=\"windowsPE\">\n"
         "    <component name=\"Microsoft-Windows-Setup\"><P><Size>1</Size></P><P><Size>2</Size>"
         "<P><Size>3</Size></P></P><P/></component>\n"
         "  </settings>\n"
         "</unattend>\n";
}

constexpr char kUser[] = TVXTEST_OOBE "/urn:AutoLogon/urn:Username";
constexpr char kSetup[] = TVXTEST_PE_SETUP;

class XmlOps : public ::testing::Test {
 protected:
  void Load(const std::string &text) {
    doc_.reset(xmlReadMemory(text.data(), static_cast<int>(text.size()), "t.xml", nullptr,
                             XML_PARSE_NONET));
    ASSERT_NE(doc_, nullptr);
    ctx_.reset(AutoInstallXmlNewContext(doc_.get()));
    ASSERT_NE(ctx_, nullptr);
  }
  // Save writes the document out, checks it with xmllint and parses it back.
  std::string Save() {
    std::string path = dir_.Join("out.xml");
    EXPECT_GE(xmlSaveFile(path.c_str(), doc_.get()), 0);
    EXPECT_TRUE(tvxtest::XmllintAccepts(path)) << tvxtest::ReadFileOrDie(path);
    return path;
  }

  tvxtest::TempDir dir_;
  tvx::UniquePtr<xmlDoc> doc_;
  tvx::UniquePtr<xmlXPathContext> ctx_;
};

TEST_F(XmlOps, SetTextKeepsMarkupCharactersAndNonAsciiIntact) {
  const char *texts[] = {
      "already &amp; escaped &#65; &lt; ]]> <Ltd>",
      "J\xC3\xBCrgen M\xC3\xBCller \xE5\xB1\xB1\xE7\x94\xB0 \xF0\x9F\x98\x80",
      "tab\tand\r\nline ends",
      "",
  };
  for (const char *text : texts) {
    Load(Doc());
    ASSERT_TRUE(AutoInstallXmlSetText(ctx_.get(), kUser, text)) << text;
    UnattendXml back(Save());
    EXPECT_EQ(back.Text(kUser), text);
  }
}

TEST_F(XmlOps, SetTextRefusesWhatXmlCannotCarry) {
  const char *texts[] = {"bell\a", "bad \xC3 utf-8", "overlong \xC0\xAF", "surrogate \xED\xA0\x80",
                         "\xEF\xBF\xBE"};
  for (const char *text : texts) {
    Load(Doc());
    EXPECT_FALSE(AutoInstallXmlSetText(ctx_.get(), kUser, text)) << text;
    UnattendXml back(Save());
    EXPECT_EQ(back.Text(kUser), "old");
  }
}

TEST_F(XmlOps, OperationsOnMissingElementsReportFalseAndChangeNothing) {
  Load(Doc());
  const char *missing = TVXTEST_OOBE "/urn:TimeZone";
  EXPECT_FALSE(AutoInstallXmlSetText(ctx_.get(), missing, "UTC"));
  EXPECT_FALSE(AutoInstallXmlRemoveNodes(ctx_.get(), missing));
  EXPECT_FALSE(AutoInstallXmlSetAmd64(ctx_.get(), missing));
  // An expression that is not a node set is no match either.
  EXPECT_FALSE(AutoInstallXmlSetText(ctx_.get(), "count(//urn:Order)", "1"));
  UnattendXml back(Save());
  EXPECT_EQ(back.Count(missing), 0u);
}

TEST_F(XmlOps, FirstLogonOrderEdgeCases) {
  struct Case {
    const char *lastOrder;
    const char *expected;  // null: the command is not added
  };
  const Case cases[] = {
      {"998", "999"},
      {"999", nullptr},                    // four digits do not fit
      {"99999999999999999999", nullptr},   // beyond long
      {"-5", nullptr},
      {"x", "1"},                          // no digits: counts as 0
  };
  for (const Case &c : cases) {
    Load(Doc(c.lastOrder));
    Bool added = AutoInstallXmlAddFirstLogonCommand(doc_.get(), "cmd");
    UnattendXml back(Save());
    if (c.expected == nullptr) {
      EXPECT_FALSE(added) << c.lastOrder;
      EXPECT_EQ(back.Count(TVXTEST_FIRST_LOGON), 2u) << c.lastOrder;
    } else {
      EXPECT_TRUE(added) << c.lastOrder;
      EXPECT_EQ(back.Texts(TVXTEST_FIRST_LOGON "/urn:Order").back(), c.expected) << c.lastOrder;
    }
  }
}

TEST_F(XmlOps, FirstLogonCommandDeclaresTheWcmPrefixWhenTheTemplateLacksIt) {
  Load(Doc("1", /*declareWcm=*/false));
  ASSERT_TRUE(AutoInstallXmlAddFirstLogonCommand(doc_.get(), "cmd"));
  UnattendXml back(Save());
  EXPECT_EQ(back.Count(TVXTEST_FIRST_LOGON "[@wcm:action='add']"), 1u);
}

TEST(AutoInstallEditUnattendXml, RefusesUnparsableFilesAndUncarriableTexts) {
  tvxtest::TempDir dir;
  tvxtest::LogCapture log;
  EXPECT_FALSE(AutoInstallEditUnattendXml(dir.Join("absent.xml").c_str(), nullptr, "n", nullptr,
                                          nullptr, GUESTOS_ID_UNKNOWN, 0, "en-US", "img", TRUE, FALSE));
  // A name XML cannot hold leaves the copy untouched rather than half-edited.
  std::string good = dir.Join("good.xml");
  tvxtest::WriteFileOrDie(good, Doc());
  EXPECT_FALSE(AutoInstallEditUnattendXml(good.c_str(), nullptr, "bad\x02name", nullptr, nullptr,
                                          GUESTOS_ID_UNKNOWN, 0, "en-US", "img", TRUE, FALSE));
  EXPECT_EQ(tvxtest::ReadFileOrDie(good), Doc());
  // The XML step itself stays silent; the driver reports.
  EXPECT_TRUE(log.Lines().empty()) << log.All();
}

TEST(AutoInstallEditUnattendXml, LeavesEntityReferencesUnexpanded) {
  tvxtest::TempDir dir;
  std::string path = dir.Join("entities.xml");
  std::string text = Doc();
  text.replace(text.find("old"), 3, "&who;&ext;");
  text.insert(text.find('\n') + 1,
              "<!DOCTYPE unattend [<!ENTITY who \"Tarvex\">"
              "<!ENTITY ext SYSTEM \"http://127.0.0.1:9/x\">]>\n");
  tvxtest::WriteFileOrDie(path, text);
  EXPECT_TRUE(AutoInstallEditUnattendXml(path.c_str(), nullptr, nullptr, nullptr, nullptr,
                                         GUESTOS_ID_UNKNOWN, 0, "en-US", "img", TRUE, FALSE));
  std::string saved = tvxtest::ReadFileOrDie(path);
  EXPECT_NE(saved.find("<Username>&who;&ext;</Username>"), std::string::npos) << saved;
  EXPECT_TRUE(tvxtest::XmllintAccepts(path));
}

}  // namespace
