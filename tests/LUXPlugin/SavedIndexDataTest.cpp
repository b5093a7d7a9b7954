// A book's semantic data beside the model that was made of it.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>

#include "tests/LUXPlugin/LUXWorld.h"

using platform::Data;
using platform::FailingFileManager;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using tests::LogEntry;
using tests::LUXWorld;

namespace {

class SavedIndexData : public testing::Test {
 protected:
  bool save(const std::string& bytes, const std::string& bookID = "org.one") const {
    return LUXSearchController::_saveVersionedLUXIndexData(Data::copy(bytes), bookID, model);
  }
  std::string saved(const std::string& bookID = "org.one") const {
    const auto bytes = platform::systemFileManager()->contentsAtPath(directory + "/" + bookID);
    if (!bytes) {
      return "(nothing)";
    }
    const platform::Value root = platform::ClassicUnarchiver(*bytes).decodeRootObject();
    const Data* data = root["LUXIndexData"].dataIf();
    return root.dictionaryIf() != nullptr && root.dictionaryIf()->size() == 1 && data != nullptr
               ? std::string(data->view())
               : "(something else)";
  }
  void makeModelFolder() const { std::filesystem::create_directories(model); }

  LUXWorld world;
  const std::string model = world.folder.path("model");
  const std::string directory = model + "/HelpLUXIndexFile";
};

TEST_F(SavedIndexData, isAnArchiveOfOneEntry) {
  makeModelFolder();
  EXPECT_TRUE(save("bytes"));
  EXPECT_TRUE(save("others", "org.two*1.0"));
  EXPECT_EQ(saved(), "bytes");
  EXPECT_EQ(saved("org.two*1.0"), "others");
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST_F(SavedIndexData, replacesWhatWasThere) {
  makeModelFolder();
  EXPECT_TRUE(save("old"));
  EXPECT_TRUE(save("new"));
  EXPECT_EQ(saved(), "new");
}

TEST_F(SavedIndexData, makesNoFolderAboveItsOwn) {
  EXPECT_FALSE(save("bytes"));
  ASSERT_THAT(world.log->entries(), SizeIs(2));
  EXPECT_EQ(world.log->entries()[0], (LogEntry{3, "Couldn't create directory " + directory}));
  EXPECT_EQ(world.log->entries()[1].level, 3);
  EXPECT_THAT(world.log->entries()[1].message, testing::HasSubstr("No such file or directory"));
  EXPECT_FALSE(std::filesystem::exists(model));
}

TEST_F(SavedIndexData, tellsThatItCannotBeWritten) {
  makeModelFolder();
  EXPECT_TRUE(save("old"));
  world.files->fail(FailingFileManager::Operation::write, ENOSPC);
  EXPECT_FALSE(save("new"));
  EXPECT_THAT(world.log->entries(),
              ElementsAre(LogEntry{3, "Couldn't write LUX index to " + directory + "/org.one"}));
  EXPECT_EQ(saved(), "old");
}

TEST_F(SavedIndexData, doesNotNoticeAFileInTheFoldersPlaceUntilItWrites) {
  world.folder.write("model/HelpLUXIndexFile", "a file");
  EXPECT_FALSE(save("bytes"));
  EXPECT_THAT(world.log->entries(),
              ElementsAre(LogEntry{3, "Couldn't write LUX index to " + directory + "/org.one"}));
}

}  // namespace
