#include <gtest/gtest.h>

#include <thread>

#include "platform/Exception.h"
#include "platform/WorkerThreads.h"
#include "tests/platform/services/NotificationRecorder.h"

namespace platform {
namespace {

using Lines = std::vector<std::string>;
using tests::NotificationRecorder;

TEST(LocalNotificationCenter, deliversOnTheMainQueueAndNeverInsideThePosting) {
  NotificationRecorder recorder;
  const auto center = localNotificationCenter();
  bool onMain = false;
  const auto observation =
      center->addObserver("Changed", [&](const DistributedNotification& notification) {
        onMain = isMainThread();
        recorder.lines.push_back(notification.name);
      });
  center->postNotification("Changed", std::nullopt);
  EXPECT_TRUE(recorder.lines.empty());
  std::thread poster([&] { center->postNotification("Changed", std::nullopt); });
  poster.join();
  EXPECT_EQ(RunLoop::main()->runPending(), 2U);
  EXPECT_EQ(recorder.lines, (Lines{"Changed", "Changed"}));
  EXPECT_TRUE(onMain);
}

TEST(LocalNotificationCenter, tellsAnAbsentObjectFromAnEmptyOne) {
  NotificationRecorder recorder;
  const auto center = localNotificationCenter();
  const auto observation = center->addObserver("Changed", recorder.handler());
  center->postNotification("Changed", std::nullopt);
  center->postNotification("Changed", "");
  center->postNotification("Changed", "Bücher");
  RunLoop::main()->runPending();
  EXPECT_EQ(recorder.lines, (Lines{"Changed", "Changed()", "Changed(Bücher)"}));
}

TEST(LocalNotificationCenter, keepsTheOrderOfPostingAndOfTheObservers) {
  NotificationRecorder recorder;
  const auto center = localNotificationCenter();
  const auto first = center->addObserver("A", recorder.handler("first "));
  const auto other = center->addObserver("B", recorder.handler("other "));
  const auto second = center->addObserver("A", recorder.handler("second "));
  center->postNotification("A", "1");
  center->postNotification("B", "2");
  center->postNotification("C", "3");
  center->postNotification("A", "4");
  RunLoop::main()->runPending();
  EXPECT_EQ(recorder.lines,
            (Lines{"first A(1)", "second A(1)", "other B(2)", "first A(4)", "second A(4)"}));
}

TEST(LocalNotificationCenter, anObservationEndsWhenItsLastCopyIsDropped) {
  NotificationRecorder recorder;
  const auto center = localNotificationCenter();
  auto observation = center->addObserver("A", recorder.handler());
  auto copy = observation;
  center->postNotification("A", "1");
  observation.reset();
  RunLoop::main()->runPending();
  EXPECT_EQ(recorder.lines, (Lines{"A(1)"}));
  center->postNotification("A", "2");
  copy.reset();
  RunLoop::main()->runPending();
  EXPECT_EQ(recorder.lines.size(), 1U) << "posted before, but not delivered after";
}

TEST(LocalNotificationCenter, anObservationMayBeDroppedByItsOwnHandlerAndOutliveTheCenter) {
  NotificationRecorder recorder;
  auto center = localNotificationCenter();
  DistributedNotificationCenter::Observation observation;
  observation =
      center->addObserver("A", [&, record = recorder.handler()](const auto& notification) {
        observation.reset();
        record(notification);
      });
  const auto survivor = center->addObserver("A", recorder.handler("survivor "));
  center->postNotification("A", std::nullopt);
  center->postNotification("A", std::nullopt);
  center.reset();
  RunLoop::main()->runPending();
  EXPECT_EQ(recorder.lines, (Lines{"A", "survivor A", "survivor A"}));
}

TEST(LocalNotificationCenter, whatAHandlerThrowsIsLoggedAndTheOthersStillHear) {
  NotificationRecorder recorder;
  const auto center = localNotificationCenter();
  const auto bad = center->addObserver(
      "A", [](const DistributedNotification&) { throw Exception("Name", "bad handler"); });
  const auto good = center->addObserver("A", recorder.handler());
  center->postNotification("A", std::nullopt);
  RunLoop::main()->runPending();
  EXPECT_EQ(recorder.lines, (Lines{"A"}));
  EXPECT_EQ(recorder.log().messages(0), (Lines{"bad handler"}));
}

TEST(LocalNotificationCenter, refusesWhatABusCouldNotCarry) {
  NotificationRecorder recorder;
  const auto center = localNotificationCenter();
  const auto observation = center->addObserver("A", recorder.handler());
  center->postNotification("A", "\xFF");
  center->postNotification("A", std::string("a\0b", 3));
  center->postNotification("\xC3", std::nullopt);
  center->postNotification("A", "good");
  RunLoop::main()->runPending();
  EXPECT_EQ(recorder.lines, (Lines{"A(good)"}));
  EXPECT_EQ(recorder.log().messages(1),
            Lines(3, "Notification not posted: its name or object is no text"));
}

TEST(LocalNotificationCenter, centersDoNotHearEachOther) {
  NotificationRecorder recorder;
  const auto one = localNotificationCenter();
  const auto other = localNotificationCenter();
  const auto observation = one->addObserver("A", recorder.handler());
  other->postNotification("A", std::nullopt);
  RunLoop::main()->runPending();
  EXPECT_TRUE(recorder.lines.empty());
}

}  // namespace
}  // namespace platform
