// Linux answer files read back by the parsers of their languages (sh,
// debconf, xmllint/libxml2, perl), their passwords checked with the
// system's crypt(3), hostile typed texts run through the shell and Perl to
// prove them inert, the kickstart and AutoYaST choices per version class,
// and what a failing call leaves behind.
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "lib/guestInstall/autoinstall_internal.h"
#include "lib/guestInstall/autoinstall_linux_internal.h"
#include "support/log_capture.h"
#include "support/run_argv.h"
#include "support/system_crypt.h"
#include "support/unattend_xml.h"
#include "tvx_autoinstall_linux.h"

namespace {

namespace fs = std::filesystem;
using tvx::autoinstall::AutoInstallGetLinuxKind;
using tvx::autoinstall::linuxAnswerFileTable;

constexpr char kFn[] = "AutoInstall_PrepareAnswerFileEx_Linux: ";
const std::string kHostileName = "Jo \"JJ\" O'Neil & Co <x> Zo\xc3\xab \xe7\x8e\x8b";
const std::string kHostilePassword = "$(touch x)`touch x`\"'\\@{[`touch x`]}%s";
const std::string kRootPassword = "r00t ${HOME} @ARGV \\\" ]]> \xc3\xa9";

std::vector<std::string> Lines(const std::string &text) {
  std::vector<std::string> out;
  std::stringstream ss(text);
  for (std::string l; std::getline(ss, l);) out.push_back(l);
  return out;
}

bool HasLine(const std::string &text, const std::string &line) {
  return ("\n" + text).find("\n" + line + "\n") != std::string::npos;
}

// Value of the first line that begins with `prefix` (the rest of the line).
std::string After(const std::string &text, const std::string &prefix) {
  for (const auto &l : Lines(text)) {
    if (l.rfind(prefix, 0) == 0) return l.substr(prefix.size());
  }
  return "<missing " + prefix + ">";
}

// ShellAccepts: `sh -n` on a script written into `dir`.
bool ShellAccepts(const std::string &dir, const std::string &script) {
  std::ofstream(dir + "/script.sh") << script;
  return tvxtest::RunArgv({"sh", "-n", "script.sh"}, nullptr, {.cwd = dir.c_str()}) == 0;
}

// The preseed tools scripts: the lines after each "..._command string \"
// up to the first that does not end in a backslash. sh joins them as the
// installer does.
std::vector<std::string> PreseedScripts(const std::string &text) {
  std::vector<std::string> out;
  for (size_t at = 0; (at = text.find("_command ", at)) != std::string::npos;) {
    size_t from = text.find('\n', at) + 1, to = from;
    while ((to = text.find('\n', to)) != std::string::npos && text[to - 1] == '\\') ++to;
    out.push_back(text.substr(from, to - from));
    at = to;
  }
  return out;
}

struct Prepared {
  bool ok = false;
  std::string path, text;
};

class LinuxAnswers : public ::testing::Test {
 protected:
  Prepared Prepare(const char *guestOS, uint32_t version, const std::string &fullName = "Jo Doe",
                   const char *key = nullptr, Bool powerOff = FALSE, Bool nvme = FALSE,
                   const char *user = "jo", const std::string &password = "pw",
                   const std::string &rootPassword = "rootpw") {
    Prepared p;
    std::string out = dir_.Path() + "/out";
    p.ok = AutoInstall_PrepareAnswerFileEx_Linux(guestOS, version, out.c_str(), user,
                                                 fullName.c_str(), password.c_str(),
                                                 rootPassword.c_str(), key, powerOff, 0, nvme);
    p.path = tvx::autoinstall::LinuxAnswerFilePath(AutoInstallGetLinuxKind(guestOS), out.c_str());
    p.text = p.ok ? tvxtest::ReadFileOrDie(p.path) : "";
    return p;
  }
  tvxtest::TempDir dir_;
};

// Every kind with hostile texts: the real parser accepts the file, the
// passwords verify, and the typed texts come back as typed when the guest's
// own interpreter reads them, without running anything.
TEST_F(LinuxAnswers, HostileTextsStayIntactAndInert) {
  const std::string names[] = {kHostileName, "$(touch x) `touch x` @{[`touch x`]} ${HOME}",
                               "a ]]> b \\ c % d %s", "  spaced  "};
  const tvxtest::RunOptions in{.cwd = dir_.Path().c_str()};
  for (const std::string &name : names) {
    SCOPED_TRACE(name);
    // Red Hat: %post passes sh -n; the chfn line, run by sh, gives the name.
    Prepared ks = Prepare("rhel7-64", GUESS_VERSION_RHEL_WORKSTATION, name, nullptr, FALSE, FALSE,
                          "jo", kHostilePassword, kRootPassword);
    ASSERT_TRUE(ks.ok);
    std::string post = ks.text.substr(ks.text.find("%post\n") + 6);
    post = post.substr(0, post.rfind("%end"));
    EXPECT_TRUE(ShellAccepts(dir_.Path(), post));
    std::string chfn = After(ks.text, "/usr/bin/chfn ");
    std::string out;
    tvxtest::RunArgv({"sh", "-c", "chfn() { printf '%s' \"$2\"; }; chfn " + chfn}, &out, in);
    EXPECT_EQ(out, name);
    EXPECT_EQ(tvxtest::SystemCrypt(kRootPassword, After(ks.text, "rootpw --iscrypted ")),
              After(ks.text, "rootpw --iscrypted "));
    std::string usermod = After(ks.text, "/usr/sbin/usermod -p '");
    usermod = usermod.substr(0, usermod.find('\''));
    EXPECT_EQ(tvxtest::SystemCrypt(kHostilePassword, usermod), usermod);

    // Ubuntu: debconf reads the file; the name is the value as typed.
    Prepared ps = Prepare("ubuntu-64", GUESS_VERSION_UBUNTU_1504_TO_2004, name, nullptr, FALSE,
                          FALSE, "jo", kHostilePassword, kRootPassword);
    ASSERT_TRUE(ps.ok);
    EXPECT_EQ(tvxtest::RunArgv({"debconf-set-selections", "-c", ps.path}, nullptr, in), 0);
    EXPECT_EQ(After(ps.text, "ubiquity   passwd/user-fullname string   "), name);
    std::string crypted = After(ps.text, "ubiquity   passwd/user-password-crypted password ");
    EXPECT_EQ(crypted.size(), 63u) << "\"$5$\", a 16-character salt, '$' and 43";
    EXPECT_EQ(tvxtest::SystemCrypt(kHostilePassword, crypted), crypted);
    for (const auto &script : PreseedScripts(ps.text)) {
      EXPECT_TRUE(ShellAccepts(dir_.Path(), script));
    }

    // SUSE: well-formed XML whose forename is the name.
    Prepared ay = Prepare("sles11-64", GUESS_VERSION_UNKNOWN, name, nullptr, FALSE, FALSE, "jo",
                          kHostilePassword, kRootPassword);
    ASSERT_TRUE(ay.ok);
    EXPECT_TRUE(tvxtest::XmllintAccepts(ay.path));
    tvxtest::UnattendXml xml(ay.path);
    EXPECT_EQ(xml.Text("//*[local-name()='forename']"), name);
    auto pw = xml.Texts("//*[local-name()='user_password']");
    ASSERT_EQ(pw.size(), 2u);
    EXPECT_EQ(tvxtest::SystemCrypt(kRootPassword, pw[0]), pw[0]);
    EXPECT_EQ(tvxtest::SystemCrypt(kHostilePassword, pw[1]), pw[1]);
    for (const auto &s : xml.Texts("//*[local-name()='source']")) {
      EXPECT_TRUE(ShellAccepts(dir_.Path(), s));
    }

    // Mandriva: perl compiles the file and reads back the clear texts.
    Prepared mi = Prepare("mandriva-64", GUESS_VERSION_MANDRIVA_2008_1_OR_HIGHER, name, nullptr,
                          FALSE, FALSE, "jo", kHostilePassword, kRootPassword);
    ASSERT_TRUE(mi.ok);
    EXPECT_EQ(tvxtest::RunArgv({"perl", "-c", mi.path}, nullptr, in), 0);
    out.clear();
    tvxtest::RunArgv({"perl", "-e",
                      "our $o; do $ARGV[0] or die; print join(\"\\0\", $o->{users}[0]{realname}, "
                      "$o->{users}[0]{password}, $o->{superuser}{password}, $o->{security_user})",
                      mi.path},
                     &out, in);
    EXPECT_EQ(out, name + '\0' + kHostilePassword + '\0' + kRootPassword + '\0' + "jo");
    EXPECT_FALSE(fs::exists(dir_.Path() + "/x")) << "a typed text ran as code";
  }
}

// One row per distribution and version class of the Red Hat family.
TEST_F(LinuxAnswers, KickstartChoices) {
  const struct {
    const char *guestOS;
    GuessVersion version;
    const char *key;
    int tmpl;  // 1, 2, 3
    // old: langsupport, mouse, --resolvedeps, empty zerombr switch;
    // modern: %end active, zerombr and xconfig commented.
    bool old, modern, biosboot, python;
    const char *keyLine, *firstPackage, *lastPackage, *argument;
  } kRows[] = {
      {"asianux3", GUESS_VERSION_UNKNOWN, nullptr, 1, false, false, false, true, "#key --skip",
       "@ base-x", "@ kde-desktop", "ks=cdrom:/ks.cfg"},
      {"asianux4-64", GUESS_VERSION_UNKNOWN, nullptr, 1, false, true, false, true, "#key --skip",
       "@ Chinese-support", "@ x11", "ks=cdrom:/ks.cfg"},
      {"rhel6-64", GUESS_VERSION_RHEL_SERVER, "abc-123", 1, false, true, false, true,
       "#key abc-123", "@ Desktop", "kernel-devel", "ks=cdrom:/ks.cfg"},
      {"rhel7-64", GUESS_VERSION_RHEL_SERVER, nullptr, 3, false, true, false, true, "#key --skip",
       "gcc", "@guest-desktop-agents", "ks=cdrom:/ks.cfg"},
      {"rhel8-64", GUESS_VERSION_RHEL_WORKSTATION, nullptr, 3, false, true, false, false,
       "#key --skip", "gcc", "xorg-x11-drv-tarvex", "ks=cdrom:/ks.cfg"},
      {"rhel5", GUESS_VERSION_RHEL_CLIENT, "0123-abcd", 1, false, false, false, true,
       "key 0123-abcd", "@ X Window System", "@ Development Tools", "ks=cdrom:/ks.cfg"},
      {"rhel5-64", GUESS_VERSION_RHEL_CLIENT, "", 1, false, false, false, true, "key --skip",
       "@ X Window System", "@ Development Tools", "ks=cdrom:/ks.cfg"},
      {"rhel4", GUESS_VERSION_RHEL_SERVER, nullptr, 1, true, false, false, true, "#key --skip",
       "@ X Window System", "@ Development Tools", "ks=cdrom:/ks.cfg"},
      {"centos5", GUESS_VERSION_CENTOS_5, nullptr, 1, false, false, false, true, "key --skip",
       "@ X Window System", "@ Development Tools", "ks=cdrom:/ks.cfg"},
      {"fedora", GUESS_VERSION_FEDORA_9_TO_12, nullptr, 1, false, false, false, true, "#key --skip",
       "@ X Window System", "@ Fonts", "ks=cdrom:/ks.cfg"},
      {"fedora-64", GUESS_VERSION_FEDORA_14_TO_16, nullptr, 1, false, true, true, true,
       "#key --skip", "@ X Window System", "@ Fonts", "ks=cdrom:/ks.cfg"},
      {"fedora-64", GUESS_VERSION_FEDORA_17, nullptr, 1, false, true, true, true, "#key --skip",
       "@ X Window System", "@ Fonts", "ks=cdrom:/dev/cdrom:/ks.cfg"},
      {"fedora", GUESS_VERSION_FEDORA_18, nullptr, 1, false, true, true, true, "#key --skip",
       "@base-x", "kernel-PAE-devel", "ks=cdrom:/dev/cdrom:/ks.cfg"},
      {"fedora-64", GUESS_VERSION_FEDORA_19_TO_20, nullptr, 2, false, true, true, true,
       "#key --skip", "@base-x", "@standard", "ks=cdrom:/dev/cdrom:/ks.cfg"},
      {"fedora-64", GUESS_VERSION_FEDORA_29_OR_HIGHER, nullptr, 2, false, true, true, false,
       "#key --skip", "@container-management", "@standard", "ks=cdrom:/ks.cfg"},
  };
  for (const auto &row : kRows) {
    SCOPED_TRACE(std::string(row.guestOS) + " version " + std::to_string(row.version));
    linuxAnswerFileTable[AUTOINSTALL_LINUX_REDHAT].bootArguments = "stale";
    Prepared p = Prepare(row.guestOS, row.version, "Jo Doe", row.key, TRUE);
    ASSERT_TRUE(p.ok);
    const std::string &t = p.text;
    bool isTmpl1 = t.find("s/ rhgb//") != std::string::npos;
    bool isTmpl2 = HasLine(t, "#/usr/bin/chfn -f \"Jo Doe\" jo");
    bool isTmpl3 = t.find("S99rclocal") != std::string::npos;
    EXPECT_EQ(isTmpl1 + isTmpl2 + isTmpl3, 1);
    EXPECT_EQ(row.tmpl == 1 ? isTmpl1 : row.tmpl == 2 ? isTmpl2 : isTmpl3, true);
    const char *o = row.old ? "" : "#";
    EXPECT_TRUE(HasLine(t, std::string(o) + "langsupport --default en_US"));
    EXPECT_TRUE(HasLine(t, std::string(o) + "mouse generic3ps/2"));
    EXPECT_TRUE(HasLine(t, row.old ? "%packages --resolvedeps" : "%packages"));
    EXPECT_TRUE(HasLine(t, row.modern ? "zerombr #yes" : "zerombr yes"));
    EXPECT_TRUE(HasLine(t, row.modern ? "xconfig --startxonboot #--resolution=800x600"
                                      : "xconfig --startxonboot --resolution=800x600"));
    EXPECT_TRUE(HasLine(
        t, std::string(row.biosboot ? "" : "#") + "part biosboot --fstype=biosboot --size=1"));
    EXPECT_TRUE(HasLine(t, row.python ? "python" : "#python"));
    EXPECT_TRUE(HasLine(t, row.keyLine));
    EXPECT_TRUE(HasLine(t, "poweroff"));
    // The package list runs from the line after "python" to the first blank
    // line or %end.
    auto lines = Lines(t);
    size_t i = 0;
    while (i < lines.size() && lines[i] != "python" && lines[i] != "#python") ++i;
    ASSERT_LT(i + 1, lines.size());
    EXPECT_EQ(lines[i + 1], row.firstPackage);
    size_t j = i + 1;
    while (j + 1 < lines.size() && !lines[j + 1].empty() &&
           lines[j + 1].find("%end") == std::string::npos)
      ++j;
    EXPECT_EQ(lines[j], row.lastPackage);
    // Both %end lines share one switch.
    size_t ends = 0, active = 0;
    for (const auto &l : lines) {
      ends += l == "%end" || l == "#%end";
      active += l == "%end";
    }
    EXPECT_EQ(ends, 2u);
    EXPECT_EQ(active, row.modern ? 2u : 0u);
    EXPECT_STREQ(linuxAnswerFileTable[AUTOINSTALL_LINUX_REDHAT].bootArguments, row.argument);
  }
}

// One row per rule of the SUSE choice.
TEST_F(LinuxAnswers, AutoYastChoices) {
  const struct {
    const char *guestOS;
    GuessVersion version;
    const char *firstPattern, *lastPattern;  // openSUSE's last pattern comes with kernel-devel
    const char *displayManager;
    const char *device;  // tools CD of template A; "" for template B
  } kRows[] = {
      {"sles12-64", GUESS_VERSION_SLED_ALL, "32bit", "Basis-Devel", "gdm", ""},
      {"sles11-64", GUESS_VERSION_SLED_ALL, "default", "Basis-Devel", "gdm", "sr0"},
      {"opensuse-64", GUESS_VERSION_SLED_ALL, "default", "Basis-Devel", "kdm", "sr0"},
      {"sles11", GUESS_VERSION_UNKNOWN, "base", "Basis-Devel", "gdm", "sr0"},
      {"sles10-64", GUESS_VERSION_UNKNOWN, "default", "Basis-Devel", "gdm", "hda"},
      {"opensuse-64", GUESS_VERSION_OPENSUSE_13_2_OR_HIGHER, "kde", "devel_C_C++", "kdm", "sr0"},
      {"opensuse", GUESS_VERSION_OPENSUSE_12, "kde4", "devel_C_C++", "kdm", ""},
      {"opensuse", GUESS_VERSION_UNKNOWN, "kde4", "devel_C_C++", "kdm", "sr0"},
  };
  for (const auto &row : kRows) {
    SCOPED_TRACE(std::string(row.guestOS) + " version " + std::to_string(row.version));
    Prepared p = Prepare(row.guestOS, row.version, "Jo Doe", nullptr, TRUE);
    ASSERT_TRUE(p.ok);
    ASSERT_TRUE(tvxtest::XmllintAccepts(p.path));
    tvxtest::UnattendXml xml(p.path);
    auto patterns = xml.Texts("//*[local-name()='pattern']");
    ASSERT_FALSE(patterns.empty());
    EXPECT_EQ(patterns.front(), row.firstPattern);
    EXPECT_EQ(patterns.back(), row.lastPattern);
    EXPECT_EQ(xml.Count("//*[local-name()='package']"),
              std::string(row.lastPattern) == "devel_C_C++" ? 1u : 0u);
    EXPECT_EQ(xml.Text("//*[local-name()='display_manager']"), row.displayManager);
    EXPECT_EQ(xml.Text("//*[local-name()='final_halt']"), "true");
    const bool templateA = *row.device != '\0';
    EXPECT_EQ(xml.Count("//*[local-name()='chroot-scripts']"), templateA ? 1u : 0u);
    if (templateA) {
      EXPECT_NE(p.text.find(std::string("mount -t iso9660 /dev/") + row.device + " "),
                std::string::npos);
    }
  }
}

TEST_F(LinuxAnswers, PreseedVariants) {
  const struct {
    GuessVersion version;
    Bool nvme, powerOff;
    bool network;
  } kRows[] = {
      {GUESS_VERSION_UBUNTU_710_OR_HIGHER, TRUE, FALSE, false},
      {GUESS_VERSION_UBUNTU_1404, FALSE, TRUE, true},
      {GUESS_VERSION_UBUNTU_2010_OR_HIGHER, TRUE, FALSE, true},
  };
  for (const auto &row : kRows) {
    SCOPED_TRACE(row.version);
    Prepared p = Prepare("ubuntu-64", row.version, "Jo Doe", nullptr, row.powerOff, row.nvme);
    ASSERT_TRUE(p.ok);
    EXPECT_EQ(p.path, dir_.Path() + "/out/custom/preseed.cfg");
    EXPECT_TRUE(HasLine(p.text, std::string("ubiquity   partman-auto/disk string   ") +
                                    (row.nvme ? "/dev/nvme0n1" : "/dev/sda")));
    EXPECT_TRUE(HasLine(p.text, std::string("ubiquity   ubiquity/") +
                                    (row.powerOff ? "poweroff" : "reboot") + " boolean true"));
    std::string flag = row.network ? "if [ true = true ]" : "if [ false = true ]";
    auto scripts = PreseedScripts(p.text);
    ASSERT_EQ(scripts.size(), 2u);
    EXPECT_EQ(scripts[0], scripts[1]);
    EXPECT_NE(scripts[0].find(flag), std::string::npos);
    EXPECT_EQ(scripts[0].find("archive.ubuntu.com") != std::string::npos, row.network);
    EXPECT_EQ(scripts[0].find("run_upgrader.sh' >>") != std::string::npos, !row.network);
  }
}

// Refused and failing calls, with what each leaves behind.
TEST_F(LinuxAnswers, FailuresLeaveNothingBehind) {
  const std::string out = dir_.Path() + "/out/deeper";
  const std::string longPassword(300, 'p');
  struct Case {
    const char *what;
    const char *guestOS, *user, *fullName, *password, *root, *key;
    const char *log;
  } kCases[] = {
      {"unknown guest", "windows9-64", "jo", "Jo", "p", "r", nullptr, ""},
      {"null user", "rhel7-64", nullptr, "Jo", "p", "r", nullptr, ""},
      {"user with shell code", "rhel7-64", "jo;reboot", "Jo", "p", "r", nullptr,
       "the user name is refused: only a-z, 0-9 and '-' are allowed\n"},
      {"Ubuntu user with a digit first", "ubuntu-64", "9lives", "Jo", "p", "r", nullptr,
       "the user name is refused: only a-z, 0-9 and '-' are allowed, and it must begin with a "
       "letter\n"},
      {"line break in the full name", "ubuntu-64", "jo",
       "Jo\nd-i preseed/late_command string reboot", "p", "r", nullptr,
       "the full name is refused: it holds a control character\n"},
      {"full name ending in a backslash", "ubuntu-64", "jo", "Jo \\", "p", "r", nullptr,
       "the full name is refused: it ends in a backslash\n"},
      {"Latin-1 full name", "sles11-64", "jo", "Zo\xeb", "p", "r", nullptr,
       "the full name is refused: it is not valid UTF-8 text\n"},
      {"surrogate in UTF-8", "sles11-64", "jo", "\xed\xa0\x80", "p", "r", nullptr,
       "the full name is refused: it is not valid UTF-8 text\n"},
      {"C1 control", "sles11-64", "jo",
       "a\xc2\x85"
       "b",
       "p", "r", nullptr, "the full name is refused: it holds a control character\n"},
      {"U+FFFE", "sles11-64", "jo", "\xef\xbf\xbe", "p", "r", nullptr,
       "the full name is refused: it is not valid UTF-8 text\n"},
      {"key with a line break", "rhel5", "jo", "Jo", "p", "r", "x\n%post\nreboot",
       "the installation key is refused: only letters, digits and '-' are allowed\n"},
      {"password too long for the crypt", "rhel7-64", "jo", "Jo", longPassword.c_str(), "r",
       nullptr, "SHA256_crypt: keys longer than 256 bytes are refused (this one has 300)\n"},
  };
  for (const auto &c : kCases) {
    SCOPED_TRACE(c.what);
    tvxtest::LogCapture log;
    EXPECT_FALSE(AutoInstall_PrepareAnswerFileEx_Linux(
        c.guestOS, 0, out.c_str(), c.user, c.fullName, c.password, c.root, c.key, FALSE, 0, FALSE));
    EXPECT_FALSE(fs::exists(dir_.Path() + "/out"));
    if (c.log[0] != '\0') {
      ASSERT_FALSE(log.Lines().empty());
      const std::string want = c.log[0] == 'S' ? c.log : kFn + std::string(c.log);
      EXPECT_EQ(log.Lines().front(), want);
    } else {
      EXPECT_EQ(log.All(), "");
    }
  }

  // Ubuntu's "custom" directory cannot be made: nothing new appears.
  fs::create_directories(dir_.Path() + "/ub");
  std::ofstream(dir_.Path() + "/ub/custom") << "x";
  EXPECT_FALSE(AutoInstall_PrepareAnswerFileEx_Linux("ubuntu-64", GUESS_VERSION_UBUNTU_1404,
                                                     (dir_.Path() + "/ub").c_str(), "jo", "Jo", "p",
                                                     "r", nullptr, FALSE, 0, FALSE));
  EXPECT_EQ(tvxtest::ReadFileOrDie(dir_.Path() + "/ub/custom"), "x");
  EXPECT_EQ(std::distance(fs::directory_iterator(dir_.Path() + "/ub"), fs::directory_iterator()),
            1);
  // Under an output directory that cannot be made, nothing appears.
  std::ofstream(dir_.Path() + "/plainfile") << "x";
  EXPECT_FALSE(AutoInstall_PrepareAnswerFileEx_Linux("sles11-64", 0,
                                                     (dir_.Path() + "/plainfile/sub").c_str(), "jo",
                                                     "Jo", "p", "r", nullptr, FALSE, 0, FALSE));
  EXPECT_EQ(tvxtest::ReadFileOrDie(dir_.Path() + "/plainfile"), "x");
}

}  // namespace
