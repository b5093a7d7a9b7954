// Loads URLs as the plug-in does.
#pragma once

#include <gtest/gtest.h>

#include <memory>
#include <optional>
#include <string>

#include "host/Zebrine/RNXAssetURLProtocol.h"
#include "platform/Data.h"
#include "platform/URLError.h"
#include "platform/URLProtocol.h"
#include "platform/URLSession.h"
#include "tests/host/RemoteHostWorld.h"

namespace tests {

/// What came of it.
struct LoadedAsset {
  std::optional<platform::Data> data;
  std::shared_ptr<const platform::URLResponse> response;
  std::optional<platform::Error> error;

  int status() const { return response == nullptr ? 0 : response->statusCode(); }
  std::string body() const { return data ? std::string(data->view()) : std::string(); }
  bool failedWith(platform::URLErrorCode code) const {
    return error && platform::isURLError(*error, code);
  }
};

/// Through the shared session; `marked` for the asset protocol or not.
inline LoadedAsset loadAsset(const std::string& url, bool marked = true) {
  auto request = *platform::URLRequest::requestWithURL(urlOf(url));
  if (marked) {
    platform::URLProtocol::setProperty(true, RNXAssetURLProtocolRequest, request);
  }
  LoadedAsset result;
  Latch done;
  const auto task = platform::URLSession::sharedSession()->dataTaskWithRequest(
      request, [&](auto data, auto response, auto error) {
        result = {std::move(data), std::move(response), std::move(error)};
        done.open();
      });
  task->resume();
  EXPECT_TRUE(done.wait());
  return result;
}

}  // namespace tests
