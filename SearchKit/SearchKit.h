// The keyword engine: an index opened in place from bytes, and searches over it.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Data.h"
#include "platform/URL.h"
#include "platform/Value.h"

/// An opened index: a view of flat bytes (docs/formats/keyword-index.md). Nothing is copied or
/// decompressed when it is opened; every number read from the bytes is checked where it is used, so
/// broken bytes give fewer hits, never a wrong access.
/// Thread-safety: immutable.
class SKIndex;
/// One query under way over one index. Thread-safety: confined to one thread at a time.
class SKSearch;
/// A document by name: its path within the book, beginning with a slash. Thread-safety: immutable.
class SKDocument;

/// A query by itself, for any number of indexes. Thread-safety: internally synchronised.
class SKQuery;

using SKIndexRef = std::shared_ptr<const SKIndex>;
using SKSearchRef = std::shared_ptr<SKSearch>;
using SKQueryRef = std::shared_ptr<const SKQuery>;
using SKDocumentRef = std::shared_ptr<const SKDocument>;

/// Number of a document within its index, from 0.
using SKDocumentID = uint32_t;
/// Number of a term within its index, from 1, in the order of the terms' bytes.
using SKTermID = int64_t;

using SKSearchOptions = uint32_t;
/// A blank between terms means AND.
inline constexpr SKSearchOptions kSKSearchOptionDefault = 0;
/// A blank between terms means OR.
inline constexpr SKSearchOptions kSKSearchOptionSpaceMeansOR = 4;

/// Opens an index in constant time; it keeps the bytes alive. Null when the bytes are no index of a
/// version that this reader knows, or when an extent in the header does not fit them. `name` picks
/// one of several indexes in the same bytes; there is only ever one here, and it has no name.
SKIndexRef SKIndexOpenWithData(const platform::Data& data, std::string_view name = {});

/// Whether the bytes are the ones that were written: reads them all and compares each section's
/// CRC-32C, and the header's. For once when a file comes in; searches do without. False for null.
bool SKIndexVerifyChecksums(const SKIndexRef& index);

/// The highest term number; 0 for an index without terms.
SKTermID SKIndexGetMaximumTermID(const SKIndexRef& index);

/// The distinct terms of a text, in order of first appearance, split and folded as this index's
/// own text was. Terms need not occur in the index, and those shorter than its minimum are among
/// them: a user may be half way through a longer word. A term, taken as a query or with a star
/// after it, finds what it came from. Empty without an index.
std::vector<std::string> SKIndexCopyUniqueTerms(const SKIndexRef& index, std::string_view text);

/// A search for `query`: words, `word*`, `*word*`, `w*d`, phrases in double quotes, `+required`,
/// `-excluded` and `!excluded`, `&`, `|`, parentheses. No query is malformed: dangling operators
/// and unbalanced quotes or parentheses are read as what was most likely meant (QueryParser.h says
/// how). The search keeps the index alive. Null only without an index.
SKSearchRef SKSearchCreate(const SKIndexRef& index, std::string_view query,
                           SKSearchOptions options);

/// The same in two steps, for a query that is put to several indexes: it is read once. Never null.
SKQueryRef SKQueryCreate(std::string_view query, SKSearchOptions options);

/// Null only without an index or a query. The search keeps both alive.
SKSearchRef SKSearchCreateWithQuery(const SKIndexRef& index, const SKQueryRef& query);

/// Delivers up to `maximumCount` further hits, in no defined order, each document once a search.
/// `ids` has room for `maximumCount` entries, as has `scores` unless it is null. Stops after
/// `maximumTime` seconds of the environment's clock, and goes on from there in the next call; each
/// call gets on by some tens of microseconds of work, however little time it is given. Sets
/// `foundCount`, unless it is null, to the number of hits delivered by this call (it may be 0
/// although more follow) and returns whether more may follow.
/// Scores are above 0, finite, higher for better hits (Scoring.h says how they come about), and
/// comparable within one index and query.
bool SKSearchFindMatches(SKSearch& search, size_t maximumCount, SKDocumentID* ids, float* scores,
                         double maximumTime, size_t* foundCount);

/// One reference an id, in order; null for an id that the index does not have.
std::vector<SKDocumentRef> SKIndexCopyDocumentRefsForDocumentIDs(const SKIndexRef& index,
                                                                 std::span<const SKDocumentID> ids);

/// The document of a file URL's path; null for a URL that is no file URL or has no path.
SKDocumentRef SKDocumentCreateWithURL(const platform::URL& url);

/// The file URL of the document.
std::optional<platform::URL> SKDocumentCopyURL(const SKDocument& document);

/// The last component of the document's path.
std::string SKDocumentGetName(const SKDocument& document);

/// The document's properties in this index, a dictionary of strings: "T" its title, "D" its
/// abstract, each only where the page has one. Absent when the index does not have the document or
/// it has no properties.
std::optional<platform::Value> SKIndexCopyDocumentProperties(const SKIndexRef& index,
                                                             const SKDocument& document);
