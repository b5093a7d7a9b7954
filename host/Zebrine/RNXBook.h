// A book as the remote content service has it.
#pragma once

#include <memory>
#include <optional>
#include <string>

#include "platform/URL.h"
#include "platform/Value.h"

/// What the service answers when it is asked for a book. Thread-safety: immutable.
class RNXBook {
 public:
  // Keys of miscAttributes(); each is its own name.
  /// URL of the search index.
  static constexpr const char* remoteSearchIndexKey = "remoteSearchIndex";
  /// URL of the exact-match list.
  static constexpr const char* remoteExactMatchKey = "remoteExactMatch";

  static std::shared_ptr<RNXBook> bookWithID(std::string bookID, std::string version,
                                             std::optional<std::string> locale,
                                             platform::Value::Dictionary miscAttributes);

  const std::string& bookID() const noexcept { return _bookID; }
  /// Another text with every edition.
  const std::string& version() const noexcept { return _version; }
  /// The language, as the folder of a localization is named; absent where there is only one.
  const std::optional<std::string>& locale() const noexcept { return _locale; }
  /// What has no property of its own, by the keys above; a missing entry is something that the
  /// service does not have.
  const platform::Value& miscAttributes() const noexcept { return _miscAttributes; }
  /// The entries of miscAttributes() that are URLs.
  std::optional<platform::URL> remoteSearchIndex() const;
  std::optional<platform::URL> remoteExactMatch() const;

 private:
  RNXBook(std::string bookID, std::string version, std::optional<std::string> locale,
          platform::Value::Dictionary miscAttributes);

  const std::string _bookID;
  const std::string _version;
  const std::optional<std::string> _locale;
  const platform::Value _miscAttributes;
};
