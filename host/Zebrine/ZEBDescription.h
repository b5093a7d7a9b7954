// Values as people read them in a log.
#pragma once

#include <cstddef>
#include <string>

#include "platform/Value.h"

/// Containers nested deeper than this are shown as "…".
inline constexpr int ZEBDescriptionMaximumDepth = 8;
/// About how many bytes a description may have; the rest is shown as "…".
inline constexpr size_t ZEBDescriptionMaximumLength = 8192;

/// The value on one line: a string as it is, numbers as numbers, booleans as "true" and "false",
/// "(null)" for an absent value, arrays as ["a", 1], dictionaries as {"key": "value"}, data as
/// <5 bytes 68656c6c6f>, dates as 2001-01-01T00:00:00Z. Strings inside containers are quoted, with
/// line breaks, controls and quotes escaped. All but a string by itself is bounded in depth and
/// length.
std::string ZEBDescription(const platform::Value& value);
