// The names that keyed archives use, and what is known of classes; for the platform's own use.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/KeyedArchive.h"

namespace platform::keyedarchive {

inline constexpr const char* archiverName = "NSKeyedArchiver";
inline constexpr int64_t version = 100000;
inline constexpr const char* nilEntry = "$null";
inline constexpr const char* rootClass = "NSObject";

inline constexpr const char* archiverKey = "$archiver";
inline constexpr const char* versionKey = "$version";
inline constexpr const char* rootsKey = "$top";
inline constexpr const char* objectsKey = "$objects";
inline constexpr const char* classKey = "$class";
inline constexpr const char* classNameKey = "$classname";
inline constexpr const char* superclassesKey = "$classes";
inline constexpr const char* keysKey = "NS.keys";
inline constexpr const char* elementsKey = "NS.objects";
inline constexpr const char* textKey = "NS.string";
inline constexpr const char* bytesKey = "NS.data";

/// A key as it stands in the archive: one that begins with '$' gains a second one, so that it
/// cannot be taken for one of the archive's own.
std::string escapedKey(std::string_view key);

/// Whether this is one of the plain classes that KeyedUnarchiver names.
bool isPlainClass(std::string_view className);

/// The class itself and those above it, up to the root class.
std::vector<std::string> plainClassChain(std::string_view className);

/// The factory of a class of our own; empty when it is not registered.
KeyedUnarchiver::Factory factoryOfClass(const std::string& className);

/// Whether the class, plain or registered, is one of `allowed` (sorted) or descends from one.
bool isKindOf(const std::string& className, const std::vector<std::string>& allowed);

}  // namespace platform::keyedarchive
