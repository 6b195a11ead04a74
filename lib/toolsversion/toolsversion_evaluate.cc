// Rating the components of a filled table and combining the ratings into one
// status. The monolithic record (the tools as one package, or the "legacy"
// and "upgrader" stand-ins of older guests) is rated apart: it decides when
// the table is empty, and otherwise joins the first three rules.
#include <array>
#include <cstdarg>
#include <cstdio>

#include "lib/toolsversion/toolsversion_internal.h"
#include "platform/str.h"

namespace tvx::toolsversion {

namespace {

constexpr std::array<const char *, 10> kRatingTexts = {"blacklisted",
                                                       "too old",
                                                       "too new",
                                                       "supported old",
                                                       "supported new",
                                                       "current",
                                                       "additional in the guest",
                                                       "missing from the guest",
                                                       "not installed",
                                                       "gone"};

// The status a rating of the monolithic record gives (ratings 0 to 5 only).
constexpr uint32_t kRatingToStatus[6] = {TOOLS_STATUS_BLACKLISTED,   TOOLS_STATUS_TOO_OLD,
                                         TOOLS_STATUS_TOO_NEW,       TOOLS_STATUS_SUPPORTED_OLD,
                                         TOOLS_STATUS_SUPPORTED_NEW, TOOLS_STATUS_CURRENT};

bool IllegalMatches(const ToolsVersionNumber &guest, const ToolsVersionNumber &illegal) {
  return !IsSet(illegal) || CompareToLimit(guest, illegal) == 0;
}

std::string JoinIllegal(const std::vector<ToolsVersionNumber> &list) {
  std::string out;
  for (const auto &v : list) {
    if (!out.empty()) out += ", ";
    out += FormatVersion(v, true);
  }
  return out;
}

ComponentRow MakeRow(const std::string &name, const ComponentInfo &c) {
  return {name,
          static_cast<uint32_t>(c.status),
          c.installed,
          FormatVersion(c.versionInGuest),
          FormatVersion(c.versionOnHost),
          FormatVersion(c.avrMin),
          FormatVersion(c.avrMax),
          JoinIllegal(c.avrIllegal)};
}

void LogRow(const char *name, const char *status, const std::string &guest, char installed,
            const std::string &host, const std::string &min, const std::string &max,
            const std::string &illegal) {
  TV_LOG("%-24s: %-11.11s %-16s %c %-16s %-16s %-16s %s\n", name, status, guest.c_str(), installed,
         host.c_str(), min.c_str(), max.c_str(), illegal.c_str());
}

void LogRow(const ComponentRow &r) {
  LogRow(r.name.c_str(), ComponentStatusText(r.rating), r.guest, r.installed ? 'Y' : 'N', r.host,
         r.min, r.max, r.illegal);
}

// "A", "A and B", "A, B, and C".
std::string JoinNames(const std::vector<std::string> &names) {
  std::string out;
  for (size_t i = 0; i < names.size(); i++) {
    if (i > 0) out += names.size() == 2 ? " and " : (i + 1 == names.size() ? ", and " : ", ");
    out += names[i];
  }
  return out;
}

struct Collected {
  std::vector<std::string> names;
  std::vector<ComponentRow> rows;
};

int RateAndCollect(const void *key, void *data, void *ctx) {
  auto *info = static_cast<ComponentInfo *>(data);
  auto *out = static_cast<Collected *>(ctx);
  info->status = RateComponent(*info);
  out->names.emplace_back(static_cast<const char *>(key));
  out->rows.push_back(MakeRow(out->names.back(), *info));
  return 0;
}

// Because logs the reason line and keeps it for the report.
void Because(Report *report, const char *fmt, ...) TVX_PRINTF(2, 3);
void Because(Report *report, const char *fmt, ...) {
  va_list args;
  va_start(args, fmt);
  char *text = Str_Vasprintf(nullptr, fmt, args);
  va_end(args);
  CharPtr owned(text);
  TV_LOG("%s\n", owned.get());
  if (report != nullptr) report->reason = owned.get();
}

// ReasonOf logs "Status is X because this is status of S..." for a subject
// and the names that share its rating.
void ReasonOf(Report *report, const char *statusText, const std::string &subject,
              const std::vector<std::string> &others) {
  if (others.empty()) {
    Because(report, "Status is %s because this is status of %s.", statusText, subject.c_str());
  } else if (others.size() == 1) {
    Because(report, "Status is %s because this is status of %s and %s.", statusText,
            subject.c_str(), others[0].c_str());
  } else {
    Because(report, "Status is %s because this is status of %s and %zu more components.",
            statusText, subject.c_str(), others.size());
  }
}

}  // namespace

const char *ComponentStatusText(uint32_t rating) {
  return rating < kRatingTexts.size() ? kRatingTexts[rating] : "?";
}

ToolsComponentStatus RateComponent(const ComponentInfo &c) {
  if (!IsSet(c.versionInGuest)) {
    return IsSet(c.versionOnHost) ? TOOLS_COMPONENT_MISSING : TOOLS_COMPONENT_GONE;
  }
  if (!c.installed) return TOOLS_COMPONENT_NOT_INSTALLED;
  for (const auto &illegal : c.avrIllegal) {
    if (IllegalMatches(c.versionInGuest, illegal)) return TOOLS_COMPONENT_BLACKLISTED;
  }
  if (IsSet(c.avrMin) && CompareToLimit(c.versionInGuest, c.avrMin) < 0) {
    return TOOLS_COMPONENT_TOO_OLD;
  }
  if (IsSet(c.avrMax) && CompareToLimit(c.versionInGuest, c.avrMax) > 0) {
    return TOOLS_COMPONENT_TOO_NEW;
  }
  if (!IsSet(c.versionOnHost)) return TOOLS_COMPONENT_ADDITIONAL;
  int cmp = CompareToLimit(c.versionInGuest, c.versionOnHost);
  return cmp > 0   ? TOOLS_COMPONENT_SUPPORTED_NEW
         : cmp < 0 ? TOOLS_COMPONENT_SUPPORTED_OLD
                   : TOOLS_COMPONENT_CURRENT;
}

uint32_t EvaluateManifests(const char *hostPath, const char *avrPath, const Dictionary *guest,
                           Report *report) {
  LogSwitches switches;
  TablePtr table = LoadManifests(hostPath, avrPath, guest, &switches,
                                 report != nullptr ? report->certFile : nullptr);
  if (table == nullptr) return TOOLS_STATUS_UNKNOWN;
  return EvaluateTable(table.get(), switches, report);
}

uint32_t EvaluateTable(HashTable *table, const LogSwitches &switches, Report *report) {
  ComponentInfo mono;
  void *data = nullptr;
  if (HashTable_Remove(table, "monolithic", &data)) {
    std::unique_ptr<ComponentInfo> owned(static_cast<ComponentInfo *>(data));
    mono = *owned;
  }
  if (HashTable_Remove(table, "legacy", &data)) {
    std::unique_ptr<ComponentInfo> legacy(static_cast<ComponentInfo *>(data));
    if (!IsSet(mono.versionOnHost)) mono.versionOnHost = legacy->versionOnHost;
    if (!IsSet(mono.versionInGuest)) mono.versionInGuest = legacy->versionInGuest;
    if (!IsSet(mono.avrMin)) mono.avrMin = legacy->avrMin;
  }
  if (!IsSet(mono.versionInGuest)) {
    if (ComponentInfo *upgrader = LookupComponent(table, "upgrader")) {
      mono.versionInGuest = upgrader->versionInGuest;
    }
  }
  mono.installed = true;
  mono.status = RateComponent(mono);
  const ToolsComponentStatus m = mono.status;

  Collected all;
  HashTable_ForEach(table, RateAndCollect, &all);
  ComponentRow monoRow = MakeRow("monolithic", mono);
  if (report != nullptr) {
    report->evaluated = true;
    report->monolithic = monoRow;
    report->components = all.rows;
    report->reason.clear();
  }
  if (switches.components) {
    LogRow("Component", "Status", "Guest", 'I', "Host", "AVR Min", "AVR Max", "AVR Illegal");
    LogRow(monoRow);
    for (const auto &row : all.rows) LogRow(row);
  }

  if (all.names.empty()) {
    Because(report, "Status is %s because this is status of monolithic version.",
            ComponentStatusText(m));
    return m < 6 ? kRatingToStatus[m] : static_cast<uint32_t>(TOOLS_STATUS_UNKNOWN);
  }

  std::array<std::vector<std::string>, 10> buckets;
  for (const auto &row : all.rows) buckets[row.rating].push_back(row.name);
  if (switches.results) {
    for (uint32_t r = 0; r < buckets.size(); r++) {
      if (buckets[r].empty()) continue;
      TV_LOG("%-24s: (%3zu) %s\n", kRatingTexts[r], buckets[r].size(),
             JoinNames(buckets[r]).c_str());
    }
  }

  // Rules 1 to 3: the component buckets and the monolithic rating alike.
  for (ToolsComponentStatus r :
       {TOOLS_COMPONENT_BLACKLISTED, TOOLS_COMPONENT_TOO_OLD, TOOLS_COMPONENT_TOO_NEW}) {
    const auto &bucket = buckets[r];
    if (m == r) {
      ReasonOf(report, kRatingTexts[r], "monolithic version", bucket);
    } else if (!bucket.empty()) {
      ReasonOf(report, kRatingTexts[r], bucket[0], {bucket.begin() + 1, bucket.end()});
    } else {
      continue;
    }
    return kRatingToStatus[r];
  }
  const auto &missing = buckets[TOOLS_COMPONENT_MISSING];
  if (!missing.empty() &&
      (m == TOOLS_COMPONENT_SUPPORTED_OLD || m == TOOLS_COMPONENT_SUPPORTED_NEW)) {
    const char *text = kRatingTexts[m];
    if (missing.size() == 1) {
      Because(report,
              "Status is %s because this is status of monolithic version, and %s is missing "
              "from the guest.",
              text, missing[0].c_str());
    } else if (missing.size() == 2) {
      Because(report,
              "Status is %s because this is status of monolithic version, and %s and %s are "
              "missing from the guest.",
              text, missing[0].c_str(), missing[1].c_str());
    } else {
      Because(report,
              "Status is %s because this is status of monolithic version, and %s and %zu more "
              "components are missing from the guest.",
              text, missing[0].c_str(), missing.size() - 1);
    }
    return kRatingToStatus[m];
  }
  for (ToolsComponentStatus r : {TOOLS_COMPONENT_SUPPORTED_OLD, TOOLS_COMPONENT_SUPPORTED_NEW}) {
    const auto &bucket = buckets[r];
    if (bucket.empty()) continue;
    ReasonOf(report, kRatingTexts[r], bucket[0], {bucket.begin() + 1, bucket.end()});
    return kRatingToStatus[r];
  }
  return TOOLS_STATUS_CURRENT;
}

}  // namespace tvx::toolsversion
