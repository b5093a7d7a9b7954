// The catalogue of a publisher: which remote books a server has, and where.
#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Data.h"
#include "platform/Error.h"
#include "platform/URL.h"

/// A file of a book on a server.
struct RNXAsset {
  platform::URL url;
  /// Of the file's bytes, see platform::sha256Digest(). Nothing else is taken for this file.
  std::string sha256;

  friend bool operator==(const RNXAsset&, const RNXAsset&) = default;
};

/// One book in one language.
struct RNXCatalogueEntry {
  /// A valid identifier (ZEBHelpBook::isValidBookID).
  std::string identifier;
  /// Any text; another one with every edition.
  std::string version;
  /// The language, as the folder of a localization is named; absent where there is only one.
  std::optional<std::string> locale;
  std::string title;
  /// The folder of the book's pages.
  std::optional<platform::URL> pages;
  std::optional<RNXAsset> searchIndex;
  std::optional<RNXAsset> exactMatch;

  friend bool operator==(const RNXCatalogueEntry&, const RNXCatalogueEntry&) = default;
};

/// The books of one catalogue (docs/formats/remote-book.md), at most one entry for an identifier
/// and locale. Thread-safety: immutable while nobody writes to it, as any value.
struct RNXCatalogue {
  /// Longer ones are refused.
  static constexpr size_t maximumLength = size_t{8} << 20;

  std::vector<RNXCatalogueEntry> books;

  /// The catalogue in `data`, which was found at `url`: what URLs in it are relative to. Absent,
  /// with `error` set when given, for everything that is not as the format has it; the error says
  /// what and where. Any bytes may be given.
  static std::optional<RNXCatalogue> catalogueWithData(const platform::Data& data,
                                                       const platform::URL& url,
                                                       platform::Error* error = nullptr);

  /// The text of the catalogue, URLs as they were spelled (URL::relativeString). The same books, in
  /// whatever order, give the same bytes.
  std::string text() const;

  /// The book in the localization that suits a reader of these languages best, and where none does,
  /// in this one (ZEBBestLocalization). Null when there is no such book.
  const RNXCatalogueEntry* bookWithIdentifier(std::string_view identifier,
                                              std::string_view localization,
                                              std::span<const std::string> languages) const;

  /// The book in that very localization, empty for a book without languages; else null.
  const RNXCatalogueEntry* bookInLocalization(std::string_view identifier,
                                              std::string_view localization) const;
};
