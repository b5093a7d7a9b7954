// Another process on the bus: says that it is ready, answers one question, and ends.
// Usage: notification_peer ADDRESS
#include <cstdio>

#include "platform/DistributedNotificationCenter.h"
#include "platform/RunLoop.h"

int main(int count, char** arguments) {
  if (count != 2) {
    return 2;
  }
  const auto center = platform::busNotificationCenter(arguments[1]);
  if (center == nullptr) {
    std::fprintf(stderr, "notification_peer: no bus at %s\n", arguments[1]);
    return 1;
  }
  const auto observation =
      center->addObserver("Question", [&](const platform::DistributedNotification& notification) {
        center->postNotification("Answer", notification.object);
        platform::RunLoop::main()->stop();
      });
  center->postNotification("Ready", std::nullopt);
  platform::RunLoop::main()->runFor(platform::Seconds(30));
  return 0;
}
