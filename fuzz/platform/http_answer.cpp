// Any bytes as what a server sends, in answer to one request or to several: the first byte tells
// how often it cuts its answer, whether a cache is used, and whether credentials go along. Whatever
// comes, each task ends, and ends once.
#include <atomic>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>
#include <string_view>

#include "platform/Environment.h"
#include "platform/URLSession.h"
#include "platform/UserDefaults.h"
#include "tests/support/Latch.h"
#include "tests/support/ScriptedServer.h"

using namespace platform;

namespace {

enum Choice : uint8_t { useCache = 1, useDigest = 2, cutInPieces = 4, askTwice = 8 };

void require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

/// One server for all inputs, which sends what the present one says.
struct World {
  World()
      : server([this](const auto&, tests::ScriptedConnection& connection) { send(connection); }) {}

  void send(tests::ScriptedConnection& connection) {
    const std::shared_ptr<const std::string> bytes = std::atomic_load(&answer);
    std::string_view left = *bytes;
    const size_t piece = inPieces ? left.size() / 3 + 1 : left.size() + 1;
    while (!left.empty() && connection.send(left.substr(0, piece))) {
      left.remove_prefix(std::min(piece, left.size()));
    }
    connection.close();
  }

  std::shared_ptr<const std::string> answer = std::make_shared<const std::string>();
  std::atomic<bool> inPieces{false};
  tests::ScriptedServer server;
};

void ask(World& world, const std::shared_ptr<URLSession>& session, uint8_t choices) {
  const std::optional<URL> url = URL::URLWithString(world.server.URL("/"));
  URLRequest request =
      URLRequest::requestWithURL(*url, URLRequestCachePolicy::useProtocolCachePolicy, Seconds(5))
          .value();
  if ((choices & useDigest) != 0) {
    request.setCredential(URLCredential{URLCredential::Scheme::digest, "user", "secret"});
  }
  tests::Counter ends;
  session
      ->dataTaskWithRequest(
          request,
          [&](const std::optional<Data>& data, const std::shared_ptr<const URLResponse>& response,
              const std::optional<Error>& error) {
            require(error.has_value() == !data.has_value());
            require(error.has_value() || response != nullptr);
            require(!data || data->length() <= 1 << 20);
            ends.add();
          })
      ->resume();
  require(ends.waitFor(1));
}

/// Redirects must not lead away from this machine: no look-up of names, no other port.
bool leadsElsewhere(std::string_view bytes) {
  return bytes.find("//") != std::string_view::npos || bytes.find(":8") != std::string_view::npos;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* bytes, size_t size) {
  static World& world = *new World;
  static const auto& silence = *new EnvironmentOverride([] {
    Environment environment = Environment::system();
    environment.cachesDirectory = std::nullopt;
    environment.userDefaults = userDefaultsFromDictionary({});
    environment.log = std::make_shared<CapturingLogSink>();
    return environment;
  }());
  static_cast<void>(silence);
  if (size == 0 || leadsElsewhere({reinterpret_cast<const char*>(bytes), size})) {
    return 0;
  }
  const uint8_t choices = bytes[0];
  std::atomic_store(&world.answer, std::make_shared<const std::string>(
                                       reinterpret_cast<const char*>(bytes + 1), size - 1));
  world.inPieces = (choices & cutInPieces) != 0;
  URLSessionConfiguration configuration = URLSessionConfiguration::ephemeralSessionConfiguration();
  configuration.setMaximumBodyLength(1 << 20);
  if ((choices & useCache) != 0) {
    configuration.setURLCache(URLCache::initWithMemoryCapacity(1 << 20, 0, std::nullopt));
  }
  const auto session = URLSession::sessionWithConfiguration(configuration);
  ask(world, session, choices);
  if ((choices & askTwice) != 0) {
    ask(world, session, choices);
  }
  session->finishTasksAndInvalidate();
  return 0;
}
