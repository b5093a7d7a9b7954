#include "host/Zebrine/ZEBResult.h"

#include <functional>
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
    : _title(std::move(title)),
      _ownType(std::make_unique<const std::string>(std::move(type))),
      _type(_ownType.get()) {}

struct ZEBResult::Block {
  std::shared_ptr<const ZEBResultSource> source;
  std::unique_ptr<ZEBResult[]> results;
};

void ZEBResult::appendResultsWithSource(const std::shared_ptr<const ZEBResultSource>& source,
                                        std::span<const Sourced> results, const std::string& type,
                                        std::vector<std::shared_ptr<ZEBResult>>& to) {
  if (results.empty()) {
    return;
  }
  const auto block = std::make_shared<Block>();
  block->source = source;
  block->results.reset(new ZEBResult[results.size()]);
  for (size_t i = 0; i < results.size(); ++i) {
    ZEBResult& result = block->results[i];
    result._source = source.get();
    result._numberInSource = results[i].number;
    result._type = &type;
    result._relevance = results[i].relevance;
    to.emplace_back(block, &result);
  }
}

void ZEBResult::_fetchFromSource() const {
  ZEBResultSource::Content content = _source->contentOfResult(_numberInSource);
  _title = std::move(content.title);
  _payload = std::move(content.payload);
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
  const auto entry = _payload.find(key);
  return entry == _payload.end() ? absent : entry->second;
}

void ZEBResult::setPayload(platform::Value::Dictionary payload, PayloadKind kind) {
  _fetch();
  _payload = std::move(payload);
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
  _payload.insert_or_assign(std::string(key), std::move(value));
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
  return _title ? mixed(hash, *_title) : hash;
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
