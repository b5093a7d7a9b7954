// The help service on the user's message bus.
#pragma once

#include <functional>
#include <memory>
#include <string>

#include "platform/Error.h"

namespace zebd {

class HelpService;
class SearchListener;

/// Name, object and interface of the service on the bus (docs/bus.md).
inline const std::string ZEBBusName = "org.zeb.zebd";
inline const std::string ZEBBusPath = "/org/zeb/Help";
inline const std::string ZEBBusInterface = "org.zeb.Help1";

/// Takes requests from a message bus, hands them to a HelpService, and sends answers back to those
/// who asked, and to nobody else. Requests of other users are refused, as are those of a client
/// that has maximumRequestCount of them unanswered.
///
/// Requests arrive on a thread of its own, and all that they do happens on the main thread.
/// Thread-safety: confined to the main thread, which has to run its loop.
class BusService {
 public:
  static constexpr int maximumRequestCount = 64;

  /// Tells what the service should know of its clients.
  struct Events {
    /// Somebody asked for something.
    std::function<void()> activity;
    /// The bus is gone.
    std::function<void()> disconnected;
  };

  /// Connects to the bus at `address`, or to the user's session bus where it is empty. Null, with
  /// `error` set, when there is none.
  static std::unique_ptr<BusService> connect(const std::string& address, platform::Error& error);
  ~BusService();
  BusService(const BusService&) = delete;
  BusService& operator=(const BusService&) = delete;

  /// Sends what searches find. To be given to the help service; it may outlive this.
  std::shared_ptr<SearchListener> listener() const;

  /// From now on requests are taken. The service has to live as long as this. Returns false, with
  /// `error` set, when another process has the name.
  bool serve(HelpService& service, Events events, platform::Error& error);

  /// Gives the name back, so that the bus keeps further requests for the next daemon, and waits
  /// until all that came before has been posted to the main loop; takes it again.
  void releaseName();
  bool requestName();

 private:
  struct Implementation;
  explicit BusService(std::shared_ptr<Implementation> implementation);

  const std::shared_ptr<Implementation> _implementation;
};

}  // namespace zebd
