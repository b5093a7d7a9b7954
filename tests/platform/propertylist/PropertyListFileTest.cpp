#include <gtest/gtest.h>

#include <cerrno>

#include "platform/Environment.h"
#include "platform/PropertyList.h"
#include "tests/platform/TemporaryFolder.h"

namespace platform {
namespace {

class PropertyListFile : public ::testing::Test {
 protected:
  std::string file(const std::string& name, std::string_view content) const {
    return _folder.write(name, content);
  }

  tests::TemporaryFolder _folder;
};

TEST_F(PropertyListFile, readsBothForms) {
  const Value value = Value::Dictionary{{"k", 1}};
  const auto write = [&](PropertyListFormat format) { return dataFromPropertyList(value, format); };
  EXPECT_EQ(propertyListFromFile(file("b", write(PropertyListFormat::binary).view())), value);
  EXPECT_EQ(propertyListFromFile(file("x", write(PropertyListFormat::xml).view())), value);
}

TEST_F(PropertyListFile, givesTheErrorOfAFileThatCannotBeRead) {
  Error error;
  EXPECT_FALSE(propertyListFromFile(_folder.path("missing"), &error));
  EXPECT_EQ(error.domain, posixErrorDomain);
  EXPECT_EQ(error.code, ENOENT);
}

TEST_F(PropertyListFile, readsThroughTheEnvironment) {
  const std::string path = file("x", "<plist><dict/></plist>");
  auto files = std::make_shared<FailingFileManager>();
  files->fail(FailingFileManager::Operation::read, EIO);
  Environment environment = *Environment::current();
  environment.files = files;
  const EnvironmentOverride override(environment);
  Error error;
  EXPECT_FALSE(propertyListFromFile(path, &error));
  EXPECT_EQ(error.code, EIO);
  EXPECT_FALSE(dictionaryWithContentsOfFile(path));
  files->recover();
  EXPECT_TRUE(dictionaryWithContentsOfFile(path));
}

TEST_F(PropertyListFile, givesTheErrorOfAFileThatIsNoPropertyList) {
  Error error;
  EXPECT_FALSE(propertyListFromFile(file("x", "hello"), &error));
  EXPECT_EQ(error.domain, formatErrorDomain);
}

TEST_F(PropertyListFile, givesOnlyDictionariesAsDictionaries) {
  EXPECT_EQ(dictionaryWithContentsOfFile(file("d", "<plist><dict/></plist>")),
            Value(Value::Dictionary{}));
  EXPECT_FALSE(dictionaryWithContentsOfFile(file("a", "<plist><array/></plist>")));
  EXPECT_FALSE(dictionaryWithContentsOfFile(file("t", "hello")));
  EXPECT_FALSE(dictionaryWithContentsOfFile(_folder.path("missing")));
}

}  // namespace
}  // namespace platform
