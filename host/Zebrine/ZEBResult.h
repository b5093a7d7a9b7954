// One answer to a search.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <unordered_set>
#include <vector>

#include "platform/Value.h"

/// Where records come from that are not put together before somebody looks: a search finds hundreds
/// of pages of which a handful are shown. Thread-safety: immutable.
class ZEBResultSource {
 public:
  struct Content {
    std::optional<std::string> title;
    platform::Value::Dictionary payload;
  };

  virtual ~ZEBResultSource() = default;

  /// Title and payload of a record, by its number in the source. The same at each call.
  virtual Content contentOfResult(uint32_t number) const = 0;
};

/// A record of something found: title, kind, relevance, and a payload of further facts.
///
/// Two records are equal when kind, book and URL are: a page that was found in two ways is one
/// answer, whatever its relevance. Records without a URL (suggestions) are equal when kind, book
/// and title are; a record with a URL never equals one without. A book that is absent in both
/// counts as the same. Since relevance plays no part, it may change while a record is in a set;
/// kind, book, URL and, without one, title may not.
///
/// Thread-safety: confined to one thread at a time.
class ZEBResult {
 public:
  /// Whether keys may still be added to a payload.
  enum class PayloadKind { immutable, mutablePayload };

  /// A record with neither relevance nor payload. `andType` is one of the result kinds; the title
  /// may be absent.
  static std::shared_ptr<ZEBResult> resultWithTitle(std::optional<std::string> title,
                                                    std::string andType);
  /// The same.
  static std::shared_ptr<ZEBResult> initWithTitle(std::optional<std::string> title,
                                                  std::string andType);

  /// What a source has of one record.
  struct Sourced {
    uint32_t number = 0;
    double relevance = 0;
  };
  /// Appends a record for each, with immutable payloads. `type` must outlive all records. Title and
  /// payload are fetched when first asked for. The records share their memory and the source, which
  /// stay as long as any of them.
  static void appendResultsWithSource(const std::shared_ptr<const ZEBResultSource>& source,
                                      std::span<const Sourced> results, const std::string& type,
                                      std::vector<std::shared_ptr<ZEBResult>>& to);

  ZEBResult(const ZEBResult&) = delete;
  ZEBResult& operator=(const ZEBResult&) = delete;

  /// What the user is shown.
  const std::optional<std::string>& title() const {
    _fetch();
    return _own->title;
  }

  /// The result kind.
  const std::string& type() const noexcept { return *_type; }

  /// A number, integer or real, higher for better results; absent until it is set.
  const platform::Value& relevance() const noexcept { return _relevance; }
  void setRelevance(platform::Value relevance) { _relevance = std::move(relevance); }

  /// Facts by ZEBResult…Key; empty until it is set.
  const platform::Value::Dictionary& payload() const {
    _fetch();
    return _own->payload;
  }
  /// One entry of the payload; absent when there is none.
  const platform::Value& payloadValueForKey(std::string_view key) const;

  /// Replaces the payload.
  void setPayload(platform::Value::Dictionary payload, PayloadKind kind = PayloadKind::immutable);
  /// Replaces the payload by one to which keys may be added later.
  void setMutablePayload(platform::Value::Dictionary payload) {
    setPayload(std::move(payload), PayloadKind::mutablePayload);
  }
  bool isPayloadMutable() const noexcept { return _payloadKind == PayloadKind::mutablePayload; }

  /// Adds or replaces one entry. Throws platform::Exception "InvalidArgumentException", changing
  /// nothing, when the payload is immutable or the value absent.
  void setPayloadValue(platform::Value value, std::string_view forKey);

  /// The book that the payload names under ZEBResultBookIDKey.
  std::optional<std::string> bookID() const;

  /// See the class comment.
  bool isEqual(const ZEBResult& other) const;
  size_t hash() const;
  friend bool operator==(const ZEBResult& a, const ZEBResult& b) { return a.isEqual(b); }

  /// For logs.
  std::string description() const;

 private:
  struct Block;
  /// What a record of a search has only once somebody looks at it. Apart, so that those at which
  /// nobody looks take little memory.
  struct Own {
    std::optional<std::string> title;
    platform::Value::Dictionary payload;
    /// The kind of a record that was not made from a source.
    std::string type;
  };

  ZEBResult(std::optional<std::string> title, std::string type);
  ZEBResult(const ZEBResultSource* source, const Sourced& sourced, const std::string* type)
      : _source(source),
        _type(type),
        _relevance(sourced.relevance),
        _numberInSource(sourced.number) {}

  /// Title and payload are there afterwards.
  void _fetch() const {
    if (_source != nullptr) {
      _fetchFromSource();
    }
  }
  void _fetchFromSource() const;

  /// Null as long as there is a source.
  mutable std::unique_ptr<Own> _own;
  /// Null once nothing is to be fetched any more. Kept alive by the block that the record is in.
  mutable const ZEBResultSource* _source = nullptr;
  const std::string* _type = nullptr;
  platform::Value _relevance;
  uint32_t _numberInSource = 0;
  PayloadKind _payloadKind = PayloadKind::immutable;
};

/// Hash and equality of the records behind pointers, for unordered containers of
/// std::shared_ptr<ZEBResult>. Null equals null only.
struct ZEBResultHash {
  size_t operator()(const std::shared_ptr<ZEBResult>& result) const;
};
struct ZEBResultEqual {
  bool operator()(const std::shared_ptr<ZEBResult>& a, const std::shared_ptr<ZEBResult>& b) const;
};

/// Records without repetition: of two equal ones, the first stays.
using ZEBResultSet = std::unordered_set<std::shared_ptr<ZEBResult>, ZEBResultHash, ZEBResultEqual>;
