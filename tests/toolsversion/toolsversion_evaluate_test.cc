// Manifest entries, component ratings and how the buckets decide the status,
// from hand-written guest, host and AVR manifests.
#include <gtest/gtest.h>

#include <string>

#include "lib/toolsversion/toolsversion_internal.h"
#include "support/log_capture.h"

namespace tvx::toolsversion {
namespace {

DictPtr Dict(const std::string &text) {
  DictPtr d(Dictionary_Create());
  EXPECT_TRUE(Dictionary_LoadFromBufferEx(d.get(), text.data(), text.size(), nullptr)) << text;
  return d;
}

TEST(ToolsVersionNumber, ParsesAndFormats) {
  struct Case {
    const char *text;
    bool version;  // ParseVersion says it is one
    const char *rest;
    const char *formatted;
  } cases[] = {
      {"11.2.5.1234#4", true, "", "11.2.5.1234#4"},
      {"11#1", true, "", "11.0.0.0#1"},
      {"1.2.3.4.5.6", true, "", "1.2.3.4"},  // a fifth number is read and dropped
      {"1.2#9", true, "", "1.2.0.0#4"},      // precision limited to 4
      {"1.2.3.4#0", true, "", ""},           // not set
      {"1.2.3x", true, "x", "1.2.3.0"},
      {"1.2.", false, "", ""},
      {"1.2#", false, "", ""},
      {"4294967296", false, "", ""},  // does not fit 32 bits
  };
  for (const Case &c : cases) {
    ToolsVersionNumber v{};
    const char *end = ParseVersion(c.text, &v);
    EXPECT_EQ(end != nullptr, c.version) << c.text;
    if (end != nullptr) {
      EXPECT_STREQ(end, c.rest) << c.text;
    }
    EXPECT_EQ(FormatVersion(v), c.formatted) << c.text;
  }
}

TEST(ToolsVersionManifest, RejectedEntriesAreLoggedForHostAndAvrOnly) {
  struct Case {
    ToolsManifestKind kind;
    const char *name, *value;
    const char *message;  // logged; null: accepted silently
  } cases[] = {
      {MANIFEST_HOST, "alpha", "1.0", "No '.' in the name"},
      {MANIFEST_HOST, "alpha.version_max", "1.0", "Maximum version in non-AVR file"},
      {MANIFEST_GUEST, "alpha.version_max", "1.0", nullptr},
      {MANIFEST_HOST, "alpha.version_illegal", "1.0", "Illegal version in non-AVR file"},
      {MANIFEST_AVR, "alpha.installed", "true", "Installed flag in non-guest file"},
      {MANIFEST_HOST, "alpha.colour", "red", "Unknown entry"},
      {MANIFEST_AVR, "debug.log", "true", "Unknown debug entry"},
      {MANIFEST_HOST, "alpha.version", "1.2.3x", "Cannot parse version"},
      {MANIFEST_AVR, "alpha.version_illegal", "10.0.0;9.4", "Cannot parse illegal version"},
      {MANIFEST_HOST, "alpha.VERSION", "1.2.3 ", nullptr},
  };
  for (const Case &c : cases) {
    TablePtr table = NewComponentTable();
    LogSwitches switches;
    tvxtest::LogCapture log;
    HandleEntry(table.get(), c.kind, c.kind == MANIFEST_GUEST ? nullptr : &switches, c.name,
                c.value);
    std::string expected = c.message == nullptr ? ""
                                                : std::string("ToolsVersion: ") + c.message + ": " +
                                                      c.name + " = " + c.value + "\n";
    EXPECT_EQ(log.All(), expected) << c.name;
  }
}

TEST(ToolsVersionManifest, EntriesFillTheTable) {
  LogSwitches switches;
  tvxtest::LogCapture log;
  DictPtr host = Dict(
      "alpha.version = 1.2.3\nALPHA.VERSION = 9.9.9\nbeta.version = 1.2.3x\n"
      "gamma.version_max = 5\nComponents.Log = yes\n");
  DictPtr avr = Dict("alpha.version_illegal = \"10.0.0#3 , 9.4\"\nalpha.version_illegal = 7#0\n");
  DictPtr guest = Dict("delta.version = 2.0\nresult.log = true\n");
  TablePtr table = FillTable(host.get(), avr.get(), guest.get(), &switches);
  EXPECT_TRUE(log.Contains("ToolsVersion: Multiple identical entries: ALPHA.VERSION = 9.9.9\n"));
  EXPECT_TRUE(switches.components);
  EXPECT_FALSE(switches.results);  // the guest has no say
  EXPECT_EQ(LookupComponent(table.get(), "gamma"), nullptr);
  ComponentInfo *alpha = LookupComponent(table.get(), "Alpha");
  ASSERT_NE(alpha, nullptr);
  EXPECT_EQ(FormatVersion(alpha->versionOnHost), "1.2.3.0");
  ASSERT_EQ(alpha->avrIllegal.size(), 3u);
  EXPECT_EQ(FormatVersion(alpha->avrIllegal[0]), "10.0.0.0");  // "#3" is the default
  EXPECT_EQ(FormatVersion(alpha->avrIllegal[2], true), "7.0.0.0#0");
  EXPECT_FALSE(IsSet(alpha->avrMin));  // an AVR manifest was given
  EXPECT_EQ(FormatVersion(LookupComponent(table.get(), "beta")->versionOnHost), "1.2.3.0");

  // Without an AVR manifest the host's components, and only they, get the
  // host version as minimum.
  table = FillTable(host.get(), nullptr, guest.get(), &switches);
  EXPECT_EQ(FormatVersion(LookupComponent(table.get(), "alpha")->avrMin), "1.2.3.0");
  EXPECT_FALSE(IsSet(LookupComponent(table.get(), "delta")->avrMin));
}

// One row: the three manifests, the status, the buckets (rating -> names,
// "M" for the monolithic rating) and the reason line.
struct StatusCase {
  const char *name;
  const char *host, *avr, *guest;  // avr null: no AVR manifest
  uint32_t status;
  const char *buckets;
  const char *reason;
};

std::string Buckets(const Report &r) {
  std::string out = std::string("M=") + ComponentStatusText(r.monolithic.rating);
  for (const auto &row : r.components) {
    out += "; " + row.name + "=" + ComponentStatusText(row.rating);
  }
  return out;
}

const StatusCase kStatusCases[] = {
    {"monolithic too new above the maximum", "monolithic.version = 11.1.0\n",
     "monolithic.version_max = 11.1#2\n", "monolithic.version = 11.2.0\n", TOOLS_STATUS_TOO_NEW,
     "M=too new", "Status is too new because this is status of monolithic version."},
    {"illegal with precision 0 matches every version", "monolithic.version = 1.0\n",
     "monolithic.version_illegal = 3#0\n", "monolithic.version = 5.5\n", TOOLS_STATUS_BLACKLISTED,
     "M=blacklisted", "Status is blacklisted because this is status of monolithic version."},
    {"no monolithic anywhere", "alpha.version = 1\n", nullptr, "", TOOLS_STATUS_CURRENT,
     "M=gone; alpha=missing from the guest", ""},
    {"legacy and upgrader stand in for monolithic", "legacy.version = 11.0\nupgrader.version = 1\n",
     nullptr, "upgrader.version = 1\nupgrader.installed = yes\n", TOOLS_STATUS_TOO_OLD,
     "M=too old; upgrader=current",
     "Status is too old because this is status of monolithic version."},
    {"blacklisted beats too old", "alpha.version = 2\nbeta.version = 2\n",
     "alpha.version_illegal = 1.5 , 1.0\nbeta.version = 2\n",
     "alpha.version = 1.0\nalpha.installed = 1\nbeta.version = 1.9\nbeta.installed = 1\n",
     TOOLS_STATUS_BLACKLISTED, "M=gone; alpha=blacklisted; beta=too old",
     "Status is blacklisted because this is status of alpha."},
    {"monolithic rating joins the first rules",
     "monolithic.version = 2\nalpha.version = 2\nbeta.version = 2\n", nullptr,
     "monolithic.version = 1\nalpha.version = 1\nalpha.installed = 1\n"
     "beta.version = 1\nbeta.installed = 1\n",
     TOOLS_STATUS_TOO_OLD, "M=too old; alpha=too old; beta=too old",
     "Status is too old because this is status of monolithic version and 2 more components."},
    {"missing components under a supported-new monolithic",
     "monolithic.version = 2\na.version = 1\nb.version = 1\nc.version = 1\nd.version = 1\n",
     "monolithic.version = 1\n", "monolithic.version = 3\nd.version = 1\nd.installed = 1\n",
     TOOLS_STATUS_SUPPORTED_NEW,
     "M=supported new; a=missing from the guest; b=missing from the guest; "
     "c=missing from the guest; d=current",
     "Status is supported new because this is status of monolithic version, and a and 2 more "
     "components are missing from the guest."},
    {"monolithic supported old is ignored once the components are current",
     "monolithic.version = 2\na.version = 1\n", "monolithic.version = 1\n",
     "monolithic.version = 1.5\na.version = 1\na.installed = 1\n", TOOLS_STATUS_CURRENT,
     "M=supported old; a=current", ""},
    {"supported old and new components: old decides",
     "a.version = 2\nb.version = 2\nc.version = 2\n", "c.version = 1\n",
     "a.version = 3\na.installed = 1\nb.version = 1\nb.installed = 1\nc.version = 1\n"
     "c.installed = 1\n",
     TOOLS_STATUS_SUPPORTED_OLD, "M=gone; a=supported new; b=supported old; c=supported old",
     "Status is supported old because this is status of b and c."},
    {"supported new, additional, not installed, gone", "a.version = 2\nb.version = 2\n",
     "b.version = 1\n",
     "a.version = 1\nb.version = 3\nb.installed = 1\nextra.version = 1\nextra.installed = 1\n",
     TOOLS_STATUS_SUPPORTED_NEW,
     "M=gone; a=not installed; b=supported new; extra=additional in the guest",
     "Status is supported new because this is status of b."},
};

TEST(ToolsVersionEvaluate, BucketsDecideTheStatus) {
  for (const StatusCase &c : kStatusCases) {
    SCOPED_TRACE(c.name);
    DictPtr host = Dict(c.host), guest = Dict(c.guest);
    DictPtr avr = c.avr != nullptr ? Dict(c.avr) : nullptr;
    LogSwitches switches;
    TablePtr table = FillTable(host.get(), avr.get(), guest.get(), &switches);
    Report report;
    tvxtest::LogCapture log;
    EXPECT_EQ(EvaluateTable(table.get(), switches, &report), c.status);
    EXPECT_EQ(Buckets(report), c.buckets);
    EXPECT_EQ(report.reason, c.reason);
    std::string line = c.reason[0] == '\0' ? "" : "ToolsVersion: " + std::string(c.reason) + "\n";
    EXPECT_EQ(log.All(), line);
  }
}

}  // namespace
}  // namespace tvx::toolsversion
