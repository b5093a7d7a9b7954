#include <gtest/gtest.h>
#include <sdbus-c++/sdbus-c++.h>

#include <algorithm>
#include <cstdlib>
#include <thread>

#include "platform/Exception.h"
#include "platform/Processes.h"
#include "platform/WorkerThreads.h"
#include "tests/platform/services/NotificationRecorder.h"
#include "tests/platform/services/PrivateBus.h"
#include "tests/platform/services/UnopenedBus.h"

namespace platform {
namespace {

using Lines = std::vector<std::string>;
using tests::NotificationRecorder;
using tests::PrivateBus;

/// Somebody on the bus who sends signals of any shape.
class Stranger {
 public:
  explicit Stranger(const PrivateBus& bus)
      : _connection(sdbus::createSessionBusConnectionWithAddress(bus.address())) {}

  template <typename... Arguments>
  void send(const std::string& path, const std::string& interface, const std::string& member,
            const Arguments&... arguments) {
    const auto object = sdbus::createObject(*_connection, path);
    auto signal = object->createSignal(interface, member);
    [[maybe_unused]] const auto append = [&](const auto& argument) { signal << argument; };
    (append(arguments), ...);
    object->emitSignal(signal);
  }

 private:
  std::unique_ptr<sdbus::IConnection> _connection;
};

constexpr const char* path = "/org/zeb/Notifications";
constexpr const char* interface = "org.zeb.Notifications";
constexpr const char* member = "Posted";

TEST(BusNotificationCenter, twoCentersHearEachOtherAndThemselves) {
  NotificationRecorder recorder;
  const PrivateBus bus;
  const auto one = busNotificationCenter(bus.address());
  const auto other = busNotificationCenter(bus.address());
  ASSERT_NE(one, nullptr);
  ASSERT_NE(other, nullptr);
  const auto first = one->addObserver("Changed", recorder.handler("one "));
  const auto second = other->addObserver("Changed", recorder.handler("other "));
  one->postNotification("Changed", "1");
  ASSERT_TRUE(recorder.runUntilCount(2));
  other->postNotification("Changed", "2");
  ASSERT_TRUE(recorder.runUntilCount(4));
  std::sort(recorder.lines.begin(), recorder.lines.end());
  EXPECT_EQ(recorder.lines,
            (Lines{"one Changed(1)", "one Changed(2)", "other Changed(1)", "other Changed(2)"}));
  EXPECT_TRUE(recorder.log().entries().empty());
}

TEST(BusNotificationCenter, deliversOnTheMainQueue) {
  NotificationRecorder recorder;
  const PrivateBus bus;
  const auto center = busNotificationCenter(bus.address());
  bool heard = false;
  bool onMain = false;
  const auto observation = center->addObserver("A", [&](const DistributedNotification&) {
    heard = true;
    onMain = isMainThread();
  });
  std::thread poster([&] { center->postNotification("A", std::nullopt); });
  poster.join();
  EXPECT_FALSE(heard);
  ASSERT_TRUE(NotificationRecorder::runUntil([&] { return heard; }));
  EXPECT_TRUE(onMain);
}

TEST(BusNotificationCenter, tellsAnAbsentObjectFromAnEmptyOne) {
  NotificationRecorder recorder;
  const PrivateBus bus;
  const auto center = busNotificationCenter(bus.address());
  const auto observation = center->addObserver("Changed", recorder.handler());
  center->postNotification("Changed", std::nullopt);
  center->postNotification("Changed", "");
  center->postNotification("Changed", "Bücher");
  ASSERT_TRUE(recorder.runUntilCount(3));
  EXPECT_EQ(recorder.lines, (Lines{"Changed", "Changed()", "Changed(Bücher)"}));
}

TEST(BusNotificationCenter, aLongBurstArrivesWholeAndInOrder) {
  NotificationRecorder recorder;
  const PrivateBus bus;
  const auto sender = busNotificationCenter(bus.address());
  const auto listener = busNotificationCenter(bus.address());
  const auto observation = listener->addObserver("Number", recorder.handler());
  const std::string padding(1000, '.');
  constexpr size_t count = 1500;
  for (size_t i = 0; i < count; ++i) {
    sender->postNotification("Number", std::to_string(i) + padding);
  }
  ASSERT_TRUE(recorder.runUntilCount(count));
  for (size_t i = 0; i < count; ++i) {
    ASSERT_EQ(recorder.lines[i], "Number(" + std::to_string(i) + padding + ")");
  }
}

TEST(BusNotificationCenter, anObservationEndsWhenItIsDropped) {
  NotificationRecorder recorder;
  const PrivateBus bus;
  const auto center = busNotificationCenter(bus.address());
  auto dropped = center->addObserver("A", recorder.handler("dropped "));
  const auto kept = center->addObserver("A", recorder.handler("kept "));
  center->postNotification("A", "1");
  ASSERT_TRUE(recorder.runUntilCount(2));
  center->postNotification("A", "2");
  dropped.reset();
  ASSERT_TRUE(recorder.runUntilCount(3));
  EXPECT_EQ(recorder.lines, (Lines{"dropped A(1)", "kept A(1)", "kept A(2)"}));
}

TEST(BusNotificationCenter, aCenterThatIsDroppedLeavesTheOthersAlone) {
  NotificationRecorder recorder;
  const PrivateBus bus;
  const auto center = busNotificationCenter(bus.address());
  const auto observation = center->addObserver("A", recorder.handler());
  for (int i = 0; i < 5; ++i) {
    const auto brief = busNotificationCenter(bus.address());
    const auto unused = brief->addObserver("A", recorder.handler("brief "));
  }
  {
    const auto poster = busNotificationCenter(bus.address());
    poster->postNotification("A", "last words");
  }
  ASSERT_TRUE(recorder.runUntilCount(1));
  EXPECT_EQ(recorder.lines, (Lines{"A(last words)"}));
  EXPECT_TRUE(recorder.log().entries().empty());
}

TEST(BusNotificationCenter, anotherProcessHearsAndIsHeard) {
  NotificationRecorder recorder;
  const PrivateBus bus;
  const auto center = busNotificationCenter(bus.address());
  const auto ready = center->addObserver("Ready", recorder.handler());
  const auto answer = center->addObserver("Answer", recorder.handler());
  int status = -1;
  std::thread peer(
      [&] { status = systemProcessLauncher()->launchAndWait(NOTIFICATION_PEER, {bus.address()}); });
  EXPECT_TRUE(recorder.runUntilCount(1));
  center->postNotification("Question", "42");
  EXPECT_TRUE(recorder.runUntilCount(2));
  peer.join();
  EXPECT_EQ(status, 0);
  EXPECT_EQ(recorder.lines, (Lines{"Ready", "Answer(42)"}));
}

TEST(BusNotificationCenter, anyProgramMaySendThePlainSignal) {
  NotificationRecorder recorder;
  const PrivateBus bus;
  const auto center = busNotificationCenter(bus.address());
  const auto observation = center->addObserver("Changed", recorder.handler());
  EXPECT_EQ(systemProcessLauncher()->launchAndWait(
                "/usr/bin/dbus-send", {"--bus=" + bus.address(), "--type=signal", path,
                                       std::string(interface) + "." + member, "string:Changed",
                                       "boolean:true", "string:by hand"}),
            0);
  ASSERT_TRUE(recorder.runUntilCount(1));
  EXPECT_EQ(recorder.lines, (Lines{"Changed(by hand)"}));
}

TEST(BusNotificationCenter, ignoresSignalsThatAreNoneOfIts) {
  NotificationRecorder recorder;
  const PrivateBus bus;
  const auto center = busNotificationCenter(bus.address());
  const auto observation = center->addObserver("A", recorder.handler());
  const auto unnamed = center->addObserver("", recorder.handler("unnamed "));
  const std::string a = "A";
  Stranger stranger(bus);
  stranger.send(path, interface, member);
  stranger.send(path, interface, member, a);
  stranger.send(path, interface, member, a, true);
  stranger.send(path, interface, member, a, a, a);
  stranger.send(path, interface, member, int32_t{7}, true, a);
  stranger.send(path, interface, member, std::vector<std::string>{a, a}, true, a);
  stranger.send(path, interface, member, a, true, sdbus::Variant(a));
  stranger.send(path, interface, member, a, true, a, a);
  stranger.send(path, interface, "Other", a, true, a);
  stranger.send(path, "org.zeb.Other", member, a, true, a);
  stranger.send("/org/zeb/Other", interface, member, a, true, a);
  stranger.send(path, interface, member, a, true, std::string("the good one"));
  ASSERT_TRUE(recorder.runUntilCount(1));
  EXPECT_EQ(recorder.lines, (Lines{"A(the good one)"}));
}

TEST(BusNotificationCenter, anObjectThatIsMarkedAsAbsentStaysAbsent) {
  NotificationRecorder recorder;
  const PrivateBus bus;
  const auto center = busNotificationCenter(bus.address());
  const auto observation = center->addObserver("A", recorder.handler());
  Stranger(bus).send(path, interface, member, std::string("A"), false, std::string("noise"));
  ASSERT_TRUE(recorder.runUntilCount(1));
  EXPECT_EQ(recorder.lines, (Lines{"A"}));
}

TEST(BusNotificationCenter, textThatIsNoTextIsRefusedAndTheConnectionLivesOn) {
  NotificationRecorder recorder;
  const PrivateBus bus;
  const auto center = busNotificationCenter(bus.address());
  const auto observation = center->addObserver("A", recorder.handler());
  center->postNotification("A", "\xFF\xFE");
  center->postNotification("A\xED\xA0\x80", std::nullopt);
  center->postNotification("A", std::string("a\0b", 3));
  center->postNotification("A", "good");
  ASSERT_TRUE(recorder.runUntilCount(1));
  EXPECT_EQ(recorder.lines, (Lines{"A(good)"}));
  EXPECT_EQ(recorder.log().messages(1),
            Lines(3, "Notification not posted: its name or object is no text"));
}

TEST(BusNotificationCenter, whatAHandlerThrowsIsLoggedAndTheOthersStillHear) {
  NotificationRecorder recorder;
  const PrivateBus bus;
  const auto center = busNotificationCenter(bus.address());
  const auto bad = center->addObserver(
      "A", [](const DistributedNotification&) { throw Exception("Name", "bad handler"); });
  const auto good = center->addObserver("A", recorder.handler());
  center->postNotification("A", std::nullopt);
  ASSERT_TRUE(recorder.runUntilCount(1));
  EXPECT_EQ(recorder.log().messages(0), (Lines{"bad handler"}));
}

TEST(BusNotificationCenter, manyThreadsMayPost) {
  NotificationRecorder recorder;
  const PrivateBus bus;
  const auto center = busNotificationCenter(bus.address());
  const auto observation = center->addObserver("A", recorder.handler());
  std::vector<std::thread> threads;
  threads.reserve(4);
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&] {
      for (int i = 0; i < 50; ++i) {
        center->postNotification("A", std::nullopt);
        const auto brief = center->addObserver("B", [](const DistributedNotification&) {});
      }
    });
  }
  EXPECT_TRUE(recorder.runUntilCount(200));
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(recorder.lines.size(), 200U);
}

TEST(BusNotificationCenter, whenTheBusDiesPostingIsLoggedAndReachesThisProcessOnly) {
  NotificationRecorder recorder;
  PrivateBus bus;
  const auto center = busNotificationCenter(bus.address());
  const auto other = busNotificationCenter(bus.address());
  const auto observation = center->addObserver("A", recorder.handler());
  const auto unheard = other->addObserver("A", recorder.handler("other "));
  center->postNotification("A", "alive");
  ASSERT_TRUE(recorder.runUntilCount(2));
  recorder.lines.clear();

  bus.stop();
  ASSERT_TRUE(
      NotificationRecorder::runUntil([&] { return recorder.log().messages(1).size() == 2; }));
  for (const std::string& message : recorder.log().messages(1)) {
    EXPECT_TRUE(message.starts_with("Notifications of others are no longer heard: ")) << message;
  }
  recorder.log().clear();

  center->postNotification("A", "dead");
  RunLoop::main()->runPending();
  EXPECT_EQ(recorder.lines, (Lines{"A(dead)"}));
  ASSERT_EQ(recorder.log().entries().size(), 1U);
  EXPECT_EQ(recorder.log().entries()[0].level, 1);
  EXPECT_TRUE(recorder.log().entries()[0].message.starts_with("Notification not posted: "))
      << recorder.log().entries()[0].message;
}

TEST(BusNotificationCenter, withoutABusThereIsNoCenter) {
  NotificationRecorder recorder;
  const tests::TemporaryFolder folder;
  PrivateBus bus;
  bus.stop();
  const tests::LostConnections lost;
  EXPECT_EQ(busNotificationCenter("unix:path=" + folder.path("nothing")), nullptr);
  EXPECT_EQ(busNotificationCenter("no address at all"), nullptr);
  EXPECT_EQ(busNotificationCenter(bus.address()), nullptr);
}

TEST(BusNotificationCenter, withoutAnAddressItIsTheUsersSessionBus) {
  NotificationRecorder recorder;
  const PrivateBus bus;
  ::setenv("DBUS_SESSION_BUS_ADDRESS", bus.address().c_str(), 1);  // NOLINT(concurrency-mt-unsafe)
  const auto center = busNotificationCenter();
  ::unsetenv("DBUS_SESSION_BUS_ADDRESS");  // NOLINT(concurrency-mt-unsafe)
  ASSERT_NE(center, nullptr);
  const auto other = busNotificationCenter(bus.address());
  const auto observation = other->addObserver("A", recorder.handler());
  center->postNotification("A", std::nullopt);
  EXPECT_TRUE(recorder.runUntilCount(1));
}

}  // namespace
}  // namespace platform
