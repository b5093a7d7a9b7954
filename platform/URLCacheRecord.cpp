#include "platform/URLCacheRecord.h"

#include <algorithm>
#include <chrono>
#include <cmath>
#include <utility>
#include <vector>

#include "platform/Exception.h"
#include "platform/PropertyList.h"
#include "platform/Strings.h"
#include "platform/Value.h"

namespace platform {

namespace {

constexpr std::string_view signature = "zebURLc\n";
constexpr uint32_t version = 1;
constexpr size_t prefixLength = 32;
/// Offset of the checksum, which covers all that is before and behind it.
constexpr size_t checksumOffset = 24;
constexpr uint64_t checksumSeed = 0x7A65625552634C31;

constexpr const char* urlKey = "URL";
constexpr const char* statusKey = "Status";
constexpr const char* versionKey = "HTTPVersion";
constexpr const char* fieldsKey = "HeaderFields";
constexpr const char* variedKey = "VariedFields";
constexpr const char* dateKey = "Date";

void append(std::string& bytes, uint64_t number, int count) {
  for (int i = 0; i < count; ++i) {
    bytes += static_cast<char>(number >> (8 * i));
  }
}

uint64_t numberAt(std::string_view bytes, size_t offset, size_t count) {
  uint64_t number = 0;
  for (size_t i = 0; i < count; ++i) {
    number |= uint64_t{static_cast<unsigned char>(bytes[offset + i])} << (8 * i);
  }
  return number;
}

uint64_t checksumOf(std::string_view file) {
  return hashOfBytes(file.substr(prefixLength),
                     hashOfBytes(file.substr(0, checksumOffset), checksumSeed));
}

/// Servers may send any bytes; property lists hold text and, apart from it, data.
Value valueOfText(const std::string& text) {
  return isValidUTF8(text) ? Value(text) : Value(Data::copy(text));
}

std::optional<std::string> textOfValue(const Value& value) {
  if (const Data* data = value.dataIf()) {
    return std::string(data->view());
  }
  return value.stringValue();
}

Value valueOfFields(const HTTPHeaderFields& fields) {
  Value::Dictionary dictionary;
  for (const auto& [name, value] : fields) {
    dictionary.insert_or_assign(name, valueOfText(value));
  }
  return dictionary;
}

std::optional<HTTPHeaderFields> fieldsOfValue(const Value& value) {
  const Value::Dictionary* dictionary = value.dictionaryIf();
  if (dictionary == nullptr) {
    return std::nullopt;
  }
  HTTPHeaderFields fields;
  for (const auto& [name, content] : *dictionary) {
    const std::optional<std::string> text = textOfValue(content);
    if (!text || !isValidHTTPHeaderField(name, *text)) {
      return std::nullopt;
    }
    fields.insert_or_assign(name, *text);
  }
  return fields;
}

/// 2001-01-01 00:00 UTC, where property lists count from.
constexpr std::chrono::system_clock::time_point reference{std::chrono::seconds(978307200)};

// Microseconds, which a real number of seconds holds exactly enough to give them back.
Date dateOfTime(std::chrono::system_clock::time_point time) {
  const auto rounded = std::chrono::floor<std::chrono::microseconds>(time - reference);
  return {static_cast<double>(rounded.count()) / 1e6};
}

std::chrono::system_clock::time_point timeOfDate(Date date) {
  return reference + std::chrono::microseconds(std::llround(date.secondsSinceReference * 1e6));
}

std::vector<std::string> namesInList(std::string_view list) {
  std::vector<std::string> names;
  std::string name;
  for (const char c : list) {
    if (c == ',') {
      names.push_back(std::exchange(name, {}));
    } else if (c != ' ' && c != '\t') {
      name += c;
    }
  }
  names.push_back(name);
  names.erase(std::remove(names.begin(), names.end(), std::string()), names.end());
  return names;
}

size_t sizeOfFields(const HTTPHeaderFields& fields) {
  size_t size = 0;
  for (const auto& [name, value] : fields) {
    size += name.size() + value.size();
  }
  return size;
}

}  // namespace

uint64_t hashOfBytes(std::string_view bytes, uint64_t seed) {
  // Each step is one-to-one in the state and in the word, so that a change of any one word always
  // shows.
  constexpr uint64_t factor = 0x9E3779B97F4A7C15;
  uint64_t state = seed ^ (bytes.size() * factor);
  const auto mix = [&](uint64_t word) {
    state = (state ^ word) * factor;
    state ^= state >> 29;
  };
  while (bytes.size() >= 8) {
    mix(numberAt(bytes, 0, 8));
    bytes.remove_prefix(8);
  }
  mix(numberAt(bytes, 0, bytes.size()));
  mix(0);
  return state;
}

std::string URLCacheRecord::keyForRequest(const URLRequest& request) {
  const std::string& url = request.URL().absoluteString();
  return url.substr(0, url.find('#'));
}

std::shared_ptr<const URLCacheRecord> URLCacheRecord::recordWithCachedResponse(
    std::shared_ptr<const CachedURLResponse> cachedResponse, const URLRequest& request) {
  auto record = std::make_shared<URLCacheRecord>();
  record->key = keyForRequest(request);
  const auto varies = cachedResponse->response()->valueForHTTPHeaderField("Vary");
  for (const std::string& name : namesInList(varies.value_or(""))) {
    const std::optional<std::string> value = request.valueForHTTPHeaderField(name);
    const bool tellsWhoAsks =
        isSameHTTPFieldName(name, "Authorization") && (value || request.credential());
    if (name == "*" || tellsWhoAsks || !isValidHTTPHeaderField(name, "")) {
      return nullptr;
    }
    record->variedFields.insert_or_assign(name, value.value_or(""));
  }
  record->cachedResponse = std::move(cachedResponse);
  return record;
}

bool URLCacheRecord::matches(const URLRequest& request) const {
  return std::all_of(variedFields.begin(), variedFields.end(), [&](const auto& field) {
    return request.valueForHTTPHeaderField(field.first).value_or("") == field.second;
  });
}

size_t URLCacheRecord::size() const {
  return prefixLength + key.size() + sizeOfFields(variedFields) +
         sizeOfFields(cachedResponse->response()->allHeaderFields()) +
         cachedResponse->data().length();
}

Data URLCacheRecord::encoded() const {
  const URLResponse& response = *cachedResponse->response();
  const Value::Dictionary head = {
      {urlKey, key},
      {statusKey, response.statusCode()},
      {versionKey, valueOfText(response.HTTPVersion())},
      {fieldsKey, valueOfFields(response.allHeaderFields())},
      {variedKey, valueOfFields(variedFields)},
      {dateKey, dateOfTime(cachedResponse->date())},
  };
  const Data headBytes = dataFromPropertyList(head, PropertyListFormat::binary);
  const Data& body = cachedResponse->data();
  std::string file;
  file.reserve(prefixLength + headBytes.length() + body.length());
  file += signature;
  append(file, version, 4);
  append(file, headBytes.length(), 4);
  append(file, body.length(), 8);
  append(file, 0, 8);
  file += headBytes.view();
  file += body.view();
  repairChecksum(file);
  return Data::adopt(std::move(file));
}

void URLCacheRecord::repairChecksum(std::string& file) {
  if (file.size() >= prefixLength) {
    std::string checksum;
    append(checksum, checksumOf(file), 8);
    file.replace(checksumOffset, checksum.size(), checksum);
  }
}

std::shared_ptr<const URLCacheRecord> URLCacheRecord::decoded(const Data& file) {
  const std::string_view bytes = file.view();
  if (bytes.size() < prefixLength || !bytes.starts_with(signature) ||
      numberAt(bytes, 8, 4) != version) {
    return nullptr;
  }
  const uint64_t headLength = numberAt(bytes, 12, 4);
  const uint64_t bodyLength = numberAt(bytes, 16, 8);
  const uint64_t available = bytes.size() - prefixLength;
  if (headLength > available || bodyLength != available - headLength ||
      numberAt(bytes, checksumOffset, 8) != checksumOf(bytes)) {
    return nullptr;
  }
  const std::optional<Value> head = propertyListFromData(file.slice(prefixLength, headLength));
  if (!head) {
    return nullptr;
  }
  const std::optional<std::string> text = (*head)[urlKey].stringValue();
  const std::optional<URL> url = text ? URL::URLWithString(*text) : std::nullopt;
  const std::optional<std::string> protocol = textOfValue((*head)[versionKey]);
  std::optional<HTTPHeaderFields> fields = fieldsOfValue((*head)[fieldsKey]);
  std::optional<HTTPHeaderFields> varied = fieldsOfValue((*head)[variedKey]);
  const Date* date = (*head)[dateKey].dateIf();
  const int64_t status = (*head)[statusKey].integerValue();
  if (!url || !protocol || !fields || !varied || date == nullptr || status < 100 || status > 999) {
    return nullptr;
  }
  // In range for any clock: further away than this, the file was not written by this system.
  constexpr double furthest = 4e9;
  if (!(date->secondsSinceReference > -furthest && date->secondsSinceReference < furthest)) {
    return nullptr;
  }
  auto record = std::make_shared<URLCacheRecord>();
  record->key = *text;
  record->variedFields = std::move(*varied);
  record->cachedResponse = std::shared_ptr<const CachedURLResponse>(new CachedURLResponse(
      URLResponse::initWithURL(*url, static_cast<int>(status), *protocol, std::move(*fields)),
      file.slice(prefixLength + headLength, bodyLength), URLCacheStoragePolicy::allowed,
      timeOfDate(*date)));
  return record;
}

}  // namespace platform
