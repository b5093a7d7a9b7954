#include "zeb/DaemonState.h"

#include <sdbus-c++/sdbus-c++.h>

#include <algorithm>
#include <cstdint>
#include <map>
#include <vector>

#include "zebd/BusService.h"

namespace zeb {

namespace {

using Dictionary = std::map<std::string, sdbus::Variant>;

constexpr const char* busName = "org.freedesktop.DBus";
/// The bus may have to start it first.
constexpr std::chrono::seconds answerLimit{25};

bool isKnownToBus(sdbus::IConnection& connection) {
  const auto bus = sdbus::createProxy(connection, busName, "/org/freedesktop/DBus");
  for (const char* member : {"ListNames", "ListActivatableNames"}) {
    std::vector<std::string> names;
    bus->callMethod(member).onInterface(busName).storeResultsTo(names);
    if (std::find(names.begin(), names.end(), zebd::ZEBBusName) != names.end()) {
      return true;
    }
  }
  return false;
}

void askForStatus(sdbus::IConnection& connection, DaemonState& state) {
  const auto proxy = sdbus::createProxy(connection, zebd::ZEBBusName, zebd::ZEBBusPath);
  Dictionary status;
  proxy->callMethod("Status").onInterface(zebd::ZEBBusInterface).storeResultsTo(status);
  // A daemon of another version may say less, or otherwise.
  if (const auto version = status.find("version");
      version != status.end() && version->second.containsValueOfType<std::string>()) {
    state.version = version->second.get<std::string>();
  }
  const auto scanning = status.find("scanning");
  const auto guards = status.find("guards");
  state.isBusy = (scanning != status.end() && scanning->second.containsValueOfType<bool>() &&
                  scanning->second.get<bool>()) ||
                 (guards != status.end() && guards->second.containsValueOfType<int64_t>() &&
                  guards->second.get<int64_t>() > 0);
}

}  // namespace

DaemonState stateOfDaemon(const std::string& address) {
  DaemonState state;
  state.kind = DaemonState::Kind::noBus;
  try {
    const auto connection = address.empty() ? sdbus::createSessionBusConnection()
                                            : sdbus::createSessionBusConnectionWithAddress(address);
    connection->setMethodCallTimeout(answerLimit);
    state.kind = DaemonState::Kind::notInstalled;
    if (isKnownToBus(*connection)) {
      state.kind = DaemonState::Kind::silent;
      askForStatus(*connection, state);
      state.kind = DaemonState::Kind::running;
    }
  } catch (const sdbus::Error& error) {
    state.reason = error.getMessage();
  }
  return state;
}

}  // namespace zeb
