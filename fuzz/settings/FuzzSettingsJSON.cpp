// Arbitrary text as a JSON settings document, the form of the device
// configuration. The JSON writer is lossy by design (no escaping), so the
// tree is checked through the binary form instead: unless it holds a null,
// which that form cannot read, it must come back and encode the same.
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "settings/CSettingsObject.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  const std::string text(reinterpret_cast<const char*>(data_I), size_I);
  auto tree = CSettingsObject::ReadFromJSONBuffer(text);
  if (!tree) return 0;
  tree->GetJSONString();
  tree->GetTraceString();
  const auto binary = tree->GetASN1Binary();
  auto again = CSettingsObject::ReadFromASN1Binary(binary);
  if (again && again->GetASN1Binary() != binary) std::abort();
  return 0;
}
