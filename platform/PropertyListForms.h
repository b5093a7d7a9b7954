// The two forms of property lists behind PropertyList.h; for the platform's own use.
#pragma once

#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "platform/Data.h"
#include "platform/Value.h"

namespace platform::propertylist {

/// Whether the bytes claim to be a binary property list, of whatever version.
bool isBinary(const Data& data);

/// Throws ArchiveException, with the byte offset, for what is no binary property list.
Value valueFromBinary(const Data& data);

/// Throws Exception "InconsistentArchiveException", with the line, for what is no XML property
/// list.
Value valueFromXML(const Data& data);

/// Dictionaries, by identity(), whose keys are written in an order of their own instead of sorted.
/// Each list holds exactly the keys of its dictionary.
using KeyOrder = std::unordered_map<const void*, std::vector<std::string>>;

/// Throws Exception "InvalidArgumentException" as dataFromPropertyList does.
Data binaryFromValue(const Value& value, const KeyOrder& keyOrder = {});
Data xmlFromValue(const Value& value);

/// The most bytes that reading `inputLength` bytes may spend on copies of dictionary keys. A key
/// that is stored once may name entries of any number of dictionaries, each of which needs its own
/// copy; without a bound a long key would multiply. The bound is linear in the input and far above
/// what real lists need, where shared keys are short.
constexpr size_t keyCopyAllowance(size_t inputLength) {
  return (size_t{1} << 20) + 64 * inputLength;
}

/// Text from outside made fit for a message: cut after a few dozen characters, controls replaced,
/// in double quotes.
std::string quoted(std::string_view text);

}  // namespace platform::propertylist
