// Any bytes as a file of the URL cache; and, since hardly any bytes have the right checksum, the
// same bytes with the checksum put right. What can be read is written and read back the same.
#include <cstdint>
#include <cstdlib>
#include <string>

#include "platform/HTTPCaching.h"
#include "platform/URLCacheRecord.h"

using namespace platform;

namespace {

void require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

void check(const Data& file) {
  const auto record = URLCacheRecord::decoded(file);
  if (record == nullptr) {
    return;
  }
  const auto again = URLCacheRecord::decoded(record->encoded());
  require(again != nullptr && again->key == record->key &&
          again->variedFields == record->variedFields &&
          again->cachedResponse->data() == record->cachedResponse->data() &&
          again->cachedResponse->response()->allHeaderFields() ==
              record->cachedResponse->response()->allHeaderFields());
  // What the session does with it.
  const URLResponse& response = *record->cachedResponse->response();
  if (auto request = URLRequest::requestWithURL(response.URL())) {
    record->matches(*request);
    httpcaching::isFresh(*record->cachedResponse, *request,
                         record->cachedResponse->date() + std::chrono::seconds(1));
    httpcaching::makeConditional(*request, response);
    httpcaching::renewed(response, response);
    httpcaching::mayStore(*request, response);
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* bytes, size_t size) {
  std::string file(reinterpret_cast<const char*>(bytes), size);
  check(Data::copy(file));
  URLCacheRecord::repairChecksum(file);
  check(Data::copy(file));
  return 0;
}
