// The help-index file: an archived dictionary (docs/formats/help-index.md).
#pragma once

#include <optional>
#include <string>

#include "platform/Data.h"
#include "platform/Error.h"
#include "platform/Value.h"

namespace bvmake {

namespace helpindexkeys {
/// Data: the keyword index.
inline constexpr const char* indexData = "SKI_INDEX_DATA";
/// Dictionary: anchor name to array of page paths.
inline constexpr const char* anchorData = "SKI_ANCHOR_DATA";
/// Boolean: whether the pages live on a server.
inline constexpr const char* useRemoteRoot = "SKI_USE_REMOTE_ROOT";
/// String: URL of the pages' folder on that server.
inline constexpr const char* remoteRoot = "SKI_REMOTE_ROOT";
/// Boolean: load pages from the server though there are local ones.
inline constexpr const char* preferNetworkFiles = "SKI_PREFER_NETWORK_FILES";
/// Data: the semantic data.
inline constexpr const char* luxIndexData = "LUXIndexData";
}  // namespace helpindexkeys

/// The bytes of a help-index file for pages that lie on the disk. `anchors` is a dictionary, or
/// absent for a file without anchor table; who hands over the only copy saves the memory that it
/// takes beside the file.
platform::Data helpIndexFile(const platform::Data& indexData, const platform::Data& luxIndexData,
                             platform::Value anchors);

/// The bytes of a help-index file with other semantic data, put in the place of the old or, where
/// there are none, at the end; all other content is written as it was, whoever wrote it. Absent,
/// with `error` set when given, for bytes that are no archive of a dictionary.
std::optional<platform::Data> helpIndexFileWithLUXIndexData(const platform::Data& file,
                                                            const platform::Data& luxIndexData,
                                                            platform::Error* error = nullptr);

/// The dictionary of the file at `path`; its data values are slices of the mapped file. Absent,
/// with `error` set when given, when the file cannot be read or is no archive of a dictionary.
std::optional<platform::Value> readHelpIndexFile(const std::string& path,
                                                 platform::Error* error = nullptr);

}  // namespace bvmake
