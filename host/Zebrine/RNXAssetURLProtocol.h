// Stands between those who ask for files of remote books and the servers.
#pragma once

#include <memory>
#include <optional>
#include <string>

#include "platform/ThreadSafety.h"
#include "platform/URLProtocol.h"
#include "platform/URLSession.h"

class ZEBAuthChallengeHandler;

/// Property of a request, a boolean: the asset protocol is to load it.
inline const std::string RNXAssetURLProtocolRequest = "RNXAssetURLProtocolRequest";

/// Loads requests that are marked with the property above, and requests for files that a catalogue
/// names (RNXExpectedAssets). Adds the user's credentials for the server that is asked first, and
/// for no other: none are sent after a redirect to another one.
///
/// A file that a catalogue names is collected whole and passed on only when it is the right one;
/// otherwise its client hears of a failure and sees no byte, and the URL cache forgets what it has.
/// A file that is on this machine already is passed on from there, without asking anybody. Answers
/// of another status than 200, and files of no catalogue, are passed on as they are. What the URL
/// cache has revalidated comes as the cached answer.
///
/// Thread-safety: internally synchronised.
class RNXAssetURLProtocol : public platform::URLProtocol {
 public:
  /// Has all sessions of the process ask this kind of protocol. The handler given last is the one
  /// that is asked for credentials.
  static void registerProtocolWithAuthHandler(std::shared_ptr<ZEBAuthChallengeHandler> authHandler);

  /// The same, unless it has been done, with the handler of the configured service (RNXConfig).
  static void ensureRegistration();

  /// The kind, with credentials from the handler, for sessions of one's own.
  static std::shared_ptr<const platform::URLProtocolClass> protocolClassWithAuthHandler(
      std::shared_ptr<ZEBAuthChallengeHandler> authHandler);

  static bool canInitWithRequest(const platform::URLRequest& request);

  void startLoading() override;
  void stopLoading() override;

 private:
  class Loader;

  RNXAssetURLProtocol(platform::URLRequest request,
                      std::shared_ptr<platform::URLProtocolClient> client,
                      std::shared_ptr<ZEBAuthChallengeHandler> authHandler);
  platform::URLRequest _requestToSend() const;

  const std::shared_ptr<ZEBAuthChallengeHandler> _authHandler;
  platform::Mutex _mutex;
  std::shared_ptr<Loader> _loader GUARDED_BY(_mutex);
};
