// The three tools manifests on arbitrary text: host, AVR and guest (split at
// the first two NUL bytes) are loaded as dictionaries, walked into a
// component table and rated. The status must be one the evaluation can give,
// and every version the table holds must survive its text form.
#include <cstdint>
#include <cstdlib>
#include <string>

#include "fuzz/split_input.h"
#include "lib/toolsversion/toolsversion_internal.h"

namespace {

using namespace tvx::toolsversion;

DictPtr Load(const std::string &text) {
  DictPtr d(Dictionary_Create());
  if (!Dictionary_LoadFromBufferEx(d.get(), text.data(), text.size(), nullptr)) return nullptr;
  return d;
}

void CheckRoundTrip(const ToolsVersionNumber &v) {
  if (!IsSet(v)) return;
  ToolsVersionNumber again{};
  std::string text = FormatVersion(v);
  const char *end = ParseVersion(text.c_str(), &again);
  if (end == nullptr || *end != '\0' || again.precision != v.precision) std::abort();
  for (int i = 0; i < 4; i++) {
    if (again.numbers[i] != v.numbers[i]) std::abort();
  }
}

int CheckComponent(const void *, void *data, void *) {
  const auto *c = static_cast<const ComponentInfo *>(data);
  for (const auto *v : {&c->versionInGuest, &c->versionOnHost, &c->avrMin, &c->avrMax}) {
    CheckRoundTrip(*v);
  }
  for (const auto &v : c->avrIllegal) CheckRoundTrip(v);
  return 0;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
  if (size > 16384) return 0;
  auto parts = SplitAtNul<3>(data, size);
  DictPtr host = Load(parts[0]);
  if (host == nullptr) return 0;
  DictPtr avr = parts[1].empty() ? nullptr : Load(parts[1]);
  DictPtr guest = Load(parts[2]);
  LogSwitches switches;
  TablePtr table = FillTable(host.get(), avr.get(), guest.get(), &switches);
  HashTable_ForEach(table.get(), CheckComponent, nullptr);
  Report report;
  uint32_t status = EvaluateTable(table.get(), switches, &report);
  if (status < TOOLS_STATUS_TOO_OLD ||
      (status > TOOLS_STATUS_BLACKLISTED && status != TOOLS_STATUS_UNKNOWN)) {
    std::abort();
  }
  if (report.monolithic.rating > TOOLS_COMPONENT_GONE) std::abort();
  for (const auto &row : report.components) {
    if (row.rating > TOOLS_COMPONENT_GONE) std::abort();
  }
  return 0;
}
