#include "host/Zebrine/ZEBResult.h"

#include <cstddef>
#include <functional>
#include <memory>
#include <new>
#include <utility>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBLog.h"
#include "platform/Exception.h"

namespace {

/// The URL or book of a payload, spelled; null when it has none.
const std::string* textOf(const platform::Value& value) {
  if (const platform::URL* url = value.urlIf()) {
    return &url->absoluteString();
  }
  return value.stringIf();
}

bool sameText(const std::string* a, const std::string* b) {
  return a == nullptr || b == nullptr ? a == b : *a == *b;
}

size_t mixed(size_t seed, std::string_view text) {
  // As boost::hash_combine does it.
  return seed ^
         (std::hash<std::string_view>{}(text) + 0x9E3779B97F4A7C15U + (seed << 6U) + (seed >> 2U));
}

}  // namespace

ZEBResult::ZEBResult(std::optional<std::string> title, std::string type)
    : _own(std::make_unique<Own>(Own{std::move(title), {}, std::move(type)})), _type(&_own->type) {}

// The records of one source, side by side.
struct ZEBResult::Block {
  Block(const std::shared_ptr<const ZEBResultSource>& itsSource, std::span<const Sourced> sourced,
        const std::string& type)
      : source(itsSource), memory(new std::byte[sourced.size() * sizeof(ZEBResult)]) {
    for (const Sourced& one : sourced) {
      new (at(count++)) ZEBResult(source.get(), one, &type);
    }
  }
  ~Block() { std::destroy_n(at(0), count); }
  Block(const Block&) = delete;
  Block& operator=(const Block&) = delete;

  ZEBResult* at(size_t number) const { return reinterpret_cast<ZEBResult*>(memory.get()) + number; }

  std::shared_ptr<const ZEBResultSource> source;
  std::unique_ptr<std::byte[]> memory;
  size_t count = 0;
};

void ZEBResult::appendResultsWithSource(const std::shared_ptr<const ZEBResultSource>& source,
                                        std::span<const Sourced> results, const std::string& type,
                                        std::vector<std::shared_ptr<ZEBResult>>& to) {
  if (results.empty()) {
    return;
  }
  const auto block = std::make_shared<Block>(source, results, type);
  for (size_t i = 0; i < results.size(); ++i) {
    to.emplace_back(block, block->at(i));
  }
}

void ZEBResult::_fetchFromSource() const {
  ZEBResultSource::Content content = _source->contentOfResult(_numberInSource);
  _own = std::make_unique<Own>(Own{std::move(content.title), std::move(content.payload), {}});
  _source = nullptr;
}

std::shared_ptr<ZEBResult> ZEBResult::initWithTitle(std::optional<std::string> title,
                                                    std::string type) {
  return std::shared_ptr<ZEBResult>(new ZEBResult(std::move(title), std::move(type)));
}

std::shared_ptr<ZEBResult> ZEBResult::resultWithTitle(std::optional<std::string> title,
                                                      std::string type) {
  return initWithTitle(std::move(title), std::move(type));
}

const platform::Value& ZEBResult::payloadValueForKey(std::string_view key) const {
  static const platform::Value absent{};
  _fetch();
  const auto entry = _own->payload.find(key);
  return entry == _own->payload.end() ? absent : entry->second;
}

void ZEBResult::setPayload(platform::Value::Dictionary payload, PayloadKind kind) {
  _fetch();
  _own->payload = std::move(payload);
  _payloadKind = kind;
}

void ZEBResult::setPayloadValue(platform::Value value, std::string_view key) {
  if (_payloadKind == PayloadKind::immutable) {
    throw platform::Exception(platform::invalidArgumentException,
                              "key added to an immutable payload: " + std::string(key));
  }
  if (value.isAbsent()) {
    throw platform::Exception(platform::invalidArgumentException,
                              "absent value for a key of a payload: " + std::string(key));
  }
  _own->payload.insert_or_assign(std::string(key), std::move(value));
}

std::optional<std::string> ZEBResult::bookID() const {
  return payloadValueForKey(ZEBResultBookIDKey).stringValue();
}

bool ZEBResult::isEqual(const ZEBResult& other) const {
  const std::string* url = textOf(payloadValueForKey(ZEBResultURLKey));
  return type() == other.type() &&
         sameText(textOf(payloadValueForKey(ZEBResultBookIDKey)),
                  textOf(other.payloadValueForKey(ZEBResultBookIDKey))) &&
         sameText(url, textOf(other.payloadValueForKey(ZEBResultURLKey))) &&
         (url != nullptr || title() == other.title());
}

size_t ZEBResult::hash() const {
  size_t hash = mixed(0, type());
  if (const std::string* book = textOf(payloadValueForKey(ZEBResultBookIDKey))) {
    hash = mixed(hash, *book);
  }
  if (const std::string* url = textOf(payloadValueForKey(ZEBResultURLKey))) {
    return mixed(hash, *url);
  }
  return _own->title ? mixed(hash, *_own->title) : hash;
}

std::string ZEBResult::description() const {
  return ZEBStringWithFormat("%@ \"%@\" relevance: %@ payload: %@", type(), title(), _relevance,
                             payload());
}

size_t ZEBResultHash::operator()(const std::shared_ptr<ZEBResult>& result) const {
  return result == nullptr ? 0 : result->hash();
}

bool ZEBResultEqual::operator()(const std::shared_ptr<ZEBResult>& a,
                                const std::shared_ptr<ZEBResult>& b) const {
  return a == nullptr || b == nullptr ? a == b : a->isEqual(*b);
}
