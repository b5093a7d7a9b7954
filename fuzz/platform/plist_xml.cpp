// XML property lists: whatever is read can be written in both forms and read back the same.
#include <cstdint>
#include <cstdlib>

#include "platform/Exception.h"
#include "platform/PropertyList.h"
#include "platform/PropertyListForms.h"

using namespace platform;

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* bytes, size_t size) {
  const Data data = Data::copy({reinterpret_cast<const char*>(bytes), size});
  Value value;
  try {
    value = propertylist::valueFromXML(data);
  } catch (const Exception&) {
    return 0;
  }
  for (const PropertyListFormat format : {PropertyListFormat::binary, PropertyListFormat::xml}) {
    PropertyListFormat found{};
    const Data written = dataFromPropertyList(value, format);
    const std::optional<Value> again = propertyListFromData(written, nullptr, &found);
    if (!again || *again != value || found != format) {
      std::abort();
    }
  }
  return 0;
}
