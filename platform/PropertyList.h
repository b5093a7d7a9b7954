// Property lists: the binary form and the XML form, reading and writing.
#pragma once

#include <cstddef>
#include <optional>
#include <string>

#include "platform/Data.h"
#include "platform/Error.h"
#include "platform/Value.h"

namespace platform {

enum class PropertyListFormat { binary, xml };

/// The deepest nesting of containers, the outermost one counted, that is read or written in either
/// form. Where containers are shared, the longest path counts.
inline constexpr size_t propertyListMaximumDepth = 512;

/// The longest XML text that is read or written. The XML form cannot share what is met twice, so
/// that a small graph may stand for a text of any length.
inline constexpr size_t propertyListMaximumXMLLength = size_t{128} << 20;

/// Reads a property list of either form.
///
/// The binary form ("bplist00") is read by a bounded reader of our own: offsets, counts and
/// reference sizes are checked against the bytes there before anything is allocated, an object that
/// several containers name becomes one shared Value, and containers that contain themselves are
/// refused. Data values are slices of `data`. Time and memory are linear in the length of the
/// input. The XML form is read without network access and with any document that declares entities
/// refused; a dictionary whose one key is "CF$UID" is read as a UID. In both forms the later of two
/// equal keys wins, and sets and nulls are refused. docs/formats/property-list.md has the rest.
///
/// Returns absent, with `error` (domain formatErrorDomain) set when given, for everything that is
/// no property list; the description names what is wrong and the byte offset or the line. `format`,
/// when given, is set to the form found, and stays as it was on failure. Never throws for bad
/// input. Thread-safety: may be called from any thread.
std::optional<Value> propertyListFromData(const Data& data, Error* error = nullptr,
                                          PropertyListFormat* format = nullptr);

/// The property list of a file, read as a private copy through the environment's files; the error
/// is the file's when it cannot be read.
std::optional<Value> propertyListFromFile(const std::string& path, Error* error = nullptr);

/// Writes a property list, the same bytes for the same value. The binary form writes an object
/// that several containers share once, as it writes equal strings, numbers, dates and data once.
/// Throws Exception "InvalidArgumentException" for what a property list cannot hold: an absent
/// value, a URL, a date that is no number, ill-formed UTF-8, nesting beyond
/// propertyListMaximumDepth; in the XML form also a character that XML has no way to write (such as
/// U+0000), a date outside the years 1 to 9999, a dictionary that would be read back as a UID, and
/// text beyond propertyListMaximumXMLLength. Dates lose their fraction of a second in the XML form.
/// Thread-safety: may be called from any thread.
Data dataFromPropertyList(const Value& value, PropertyListFormat format);

/// What dictionaryWithContentsOfFile gives: the property list of the file if it is a dictionary,
/// else absent.
std::optional<Value> dictionaryWithContentsOfFile(const std::string& path);

}  // namespace platform
