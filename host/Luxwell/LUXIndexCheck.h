// Looks at every byte of a book's semantic index data.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "platform/Data.h"

/// What is wrong with versioned index data, one line of text each, at most `maximumCount` of them;
/// empty when they are what docs/formats/lux-index.md says: container, checksums, attributes, the
/// order of keys and tokens, the properties, counts and places of every document. Sections that may
/// be missing and are, are no problem. Bytes of any kind are taken. Thread-safety: any thread.
std::vector<std::string> LUXIndexProblems(const platform::Data& data, size_t maximumCount = 100);
