#include "zebd/SearchSchedule.h"

#include <gmock/gmock.h>

#include <map>
#include <random>
#include <set>

namespace {

using testing::Optional;
using zebd::SearchSchedule;

TEST(SearchScheduleTest, SearchesRunOneAfterTheOther) {
  SearchSchedule schedule;
  schedule.add("a", 1);
  schedule.add("b", 2);
  EXPECT_THAT(schedule.next(), Optional(1));
  EXPECT_TRUE(schedule.isRunning());
  EXPECT_EQ(schedule.next(), std::nullopt);
  schedule.ended();
  EXPECT_THAT(schedule.next(), Optional(2));
  schedule.ended();
  EXPECT_EQ(schedule.next(), std::nullopt);
  EXPECT_FALSE(schedule.isRunning());
}

TEST(SearchScheduleTest, NewerSearchTakesThePlaceOfTheClientsWaitingOne) {
  SearchSchedule schedule;
  schedule.add("busy", 1);
  (void)schedule.next();
  schedule.add("a", 2);
  schedule.add("b", 3);
  const auto replaced = schedule.add("a", 4);
  EXPECT_THAT(replaced.waiting, Optional(2));
  EXPECT_EQ(replaced.running, std::nullopt);
  EXPECT_EQ(schedule.waitingCount(), 2U);
  schedule.ended();
  EXPECT_THAT(schedule.next(), Optional(4)) << "the client has lost its place";
}

TEST(SearchScheduleTest, NewerSearchTellsOfTheClientsRunningOne) {
  SearchSchedule schedule;
  schedule.add("a", 1);
  (void)schedule.next();
  const auto replaced = schedule.add("a", 2);
  EXPECT_THAT(replaced.running, Optional(1));
  EXPECT_EQ(replaced.waiting, std::nullopt);
  EXPECT_EQ(schedule.next(), std::nullopt) << "the former one has not ended yet";
  schedule.ended();
  EXPECT_THAT(schedule.next(), Optional(2));
}

TEST(SearchScheduleTest, ClientThatHadItsTurnGoesBehindThoseThatWait) {
  SearchSchedule schedule;
  schedule.add("eager", 1);
  (void)schedule.next();
  schedule.add("patient", 2);
  schedule.add("eager", 3);
  schedule.ended();
  EXPECT_THAT(schedule.next(), Optional(2));
}

TEST(SearchScheduleTest, OnlyAWaitingSearchOfThatClientCanBeTakenOut) {
  SearchSchedule schedule;
  schedule.add("a", 1);
  (void)schedule.next();
  schedule.add("b", 2);
  EXPECT_FALSE(schedule.removeWaiting("a", 1)) << "it runs";
  EXPECT_FALSE(schedule.removeWaiting("a", 2)) << "it is another's";
  EXPECT_TRUE(schedule.removeWaiting("b", 2));
  EXPECT_FALSE(schedule.removeWaiting("b", 2));
  schedule.ended();
  EXPECT_EQ(schedule.next(), std::nullopt);
}

TEST(SearchScheduleTest, NobodyWaitsForMoreTurnsThanThereAreOtherClients) {
  std::mt19937 random(7);
  for (int round = 0; round < 200; ++round) {
    SearchSchedule schedule;
    const uint64_t clientCount = 1 + random() % 8;
    std::map<uint64_t, std::string> clientOf;
    std::map<std::string, size_t> turnsWaited;
    uint64_t handle = 0;
    for (int step = 0; step < 300; ++step) {
      if (random() % 2 == 0) {
        const std::string client = std::to_string(random() % clientCount);
        clientOf[++handle] = client;
        schedule.add(client, handle);
        turnsWaited.emplace(client, 0);
      } else {
        schedule.ended();
        const auto next = schedule.next();
        if (!next) {
          continue;
        }
        turnsWaited.erase(clientOf[*next]);
        for (auto& entry : turnsWaited) {
          ASSERT_LT(++entry.second, clientCount) << "in round " << round;
        }
      }
    }
  }
}

}  // namespace
