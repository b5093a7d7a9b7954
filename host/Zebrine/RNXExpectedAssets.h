// What catalogues promise of the files of remote books.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>

#include "platform/Data.h"
#include "platform/Error.h"
#include "platform/ThreadSafety.h"
#include "platform/URL.h"

/// A file that is about to be fetched.
struct RNXExpectedAsset {
  enum class Kind : uint8_t { searchIndex, exactMatch };

  Kind kind = Kind::searchIndex;
  /// See platform::sha256Digest().
  std::string sha256;
  /// Where the file is kept on this machine once it has been fetched; absent where that is not
  /// known.
  std::optional<std::string> localPath;

  /// Why the bytes are not this file: their digest is another one, or they do not open as what they
  /// should be. Absent when they are.
  std::optional<platform::Error> errorForData(const platform::Data& data) const;

  /// The file on this machine, if it is there and the right one.
  std::optional<platform::Data> localData() const;
};

/// The files that the process has read of in catalogues, by URL. Thread-safety: internally
/// synchronised.
class RNXExpectedAssets {
 public:
  static RNXExpectedAssets& shared();

  /// From now on nothing else is taken from this URL.
  void expect(const platform::URL& url, RNXExpectedAsset asset);
  /// Absent where no catalogue named the URL.
  std::optional<RNXExpectedAsset> assetForURL(const platform::URL& url) const;

 private:
  mutable platform::Mutex _mutex;
  std::map<std::string, RNXExpectedAsset, std::less<>> _assets GUARDED_BY(_mutex);
};
