// Binary property lists: whatever is read can be compared, written in both forms where they can
// hold it, and read back the same.
#include <cstdint>
#include <cstdlib>

#include "platform/Exception.h"
#include "platform/PropertyList.h"
#include "platform/PropertyListForms.h"

using namespace platform;

namespace {

// Whether the value, with what it shares counted each time, is within the allowance.
bool isSmall(const Value& value, size_t& allowance) {
  if (allowance == 0) {
    return false;
  }
  --allowance;
  if (const Value::Array* elements = value.arrayIf()) {
    for (const Value& element : *elements) {
      if (!isSmall(element, allowance)) {
        return false;
      }
    }
  }
  if (const Value::Dictionary* entries = value.dictionaryIf()) {
    for (const auto& entry : *entries) {
      if (!isSmall(entry.second, allowance)) {
        return false;
      }
    }
  }
  return true;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* bytes, size_t size) {
  const Data data = Data::copy({reinterpret_cast<const char*>(bytes), size});
  Value value;
  try {
    value = propertylist::valueFromBinary(data);
  } catch (const Exception&) {
    return 0;
  }
  const Data written = dataFromPropertyList(value, PropertyListFormat::binary);
  Error error;
  const std::optional<Value> again = propertyListFromData(written, &error);
  if (!again || *again != value ||
      dataFromPropertyList(*again, PropertyListFormat::binary) != written) {
    std::abort();
  }
  // A small graph may stand for megabytes of XML, which would only slow the search down.
  size_t allowance = 1000;
  if (!isSmall(value, allowance)) {
    return 0;
  }
  try {
    const Data xml = dataFromPropertyList(value, PropertyListFormat::xml);
    if (!propertyListFromData(xml)) {
      std::abort();
    }
  } catch (const Exception&) {
    return 0;
  }
  return 0;
}
