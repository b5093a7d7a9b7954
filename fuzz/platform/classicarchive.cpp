// Any bytes as a classic archive. What can be read must survive being written and read again, and
// so must its value.
#include <cstdint>
#include <cstdlib>
#include <string>

#include "platform/ClassicArchive.h"

namespace {

using platform::ClassicArchive;
using platform::Data;
using platform::Exception;
using platform::Value;

void require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

void checkValue(const ClassicArchive& archive, size_t root) {
  Value value;
  try {
    value = platform::classicarchive::value(archive, root);
  } catch (const Exception&) {
    return;
  }
  if (value.isAbsent()) {
    return;
  }
  Data bytes;
  try {
    bytes = platform::classicArchiveWithRootObject(value);
  } catch (const Exception&) {
    // Keys come in another order, so that references may have become nested objects: too deep.
    return;
  }
  require(platform::ClassicUnarchiver(bytes).decodeRootObject() == value);
}

/// The unarchiver makes no graph, and comes to the same value or fails alike.
void checkUnarchiver(const Data& data, const ClassicArchive& archive) {
  Value expected;
  std::string failure;
  try {
    expected = platform::classicarchive::value(archive);
  } catch (const Exception& exception) {
    failure = exception.reason();
  }
  try {
    require(platform::ClassicUnarchiver(data).decodeRootObject() == expected && failure.empty());
  } catch (const Exception& exception) {
    require(exception.reason() == failure);
  }
}

void check(const Data& data) {
  ClassicArchive archive;
  try {
    archive = platform::classicarchive::decode(data);
  } catch (const platform::ArchiveException& exception) {
    require(exception.offset() <= data.length());
    return;
  }
  checkUnarchiver(data, archive);
  const Data bytes = platform::classicarchive::encode(archive);
  const ClassicArchive again = platform::classicarchive::decode(bytes);
  require(again.nodes.size() == archive.nodes.size() && again.roots == archive.roots);
  require(platform::classicarchive::encode(again) == bytes);
  for (size_t root = 0; root < archive.roots.size() && root < 4; ++root) {
    checkValue(archive, root);
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  check(Data::wrap(data, size, nullptr));
  return 0;
}
