#include "host/Luxwell/LUXTokenSectionWriter.h"

#include <algorithm>
#include <limits>
#include <utility>

#include "host/Luxwell/LUXNumbers.h"
#include "platform/Exception.h"

using luxnumbers::appendUInt32;
using luxnumbers::appendVarnumber;

void LUXTokenSectionWriter::add(LUXTokenKind kind, std::string_view token) {
  if (_counts[static_cast<size_t>(kind)]++ == 0) {
    _before.clear();
  }
  _textLength += token.size();
  if (_textLength > std::numeric_limits<uint32_t>::max()) {
    throw platform::Exception(platform::invalidArgumentException, "too much text in tokens");
  }
  const auto differ =
      std::mismatch(_before.begin(), _before.end(), token.begin(), token.end()).second;
  const auto shared = static_cast<size_t>(differ - token.begin());
  appendVarnumber(_section, shared);
  appendVarnumber(_section, token.size() - shared);
  _section += token.substr(shared);
  _before.resize(shared);
  _before += token.substr(shared);
}

platform::Data LUXTokenSectionWriter::finish() {
  std::string counts;
  for (const uint32_t count : _counts) {
    appendUInt32(counts, count);
  }
  _section.replace(0, countsLength, counts);
  return platform::Data::adopt(std::move(_section));
}
