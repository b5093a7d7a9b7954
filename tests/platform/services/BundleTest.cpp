#include "platform/Bundle.h"

#include <dlfcn.h>
#include <gtest/gtest.h>

#include <filesystem>

#include "platform/Processes.h"
#include "tests/platform/TemporaryFolder.h"

namespace platform {
namespace {

using tests::TemporaryFolder;

std::string information(const std::string& entries) {
  return "<?xml version=\"1.0\" encoding=\"UTF-8\"?><plist version=\"1.0\"><dict>" + entries +
         "</dict></plist>";
}

std::string executableNamed(const std::string& name) {
  return information("<key>BundleExecutable</key><string>" + name + "</string>");
}

/// Code loaded from a file for the length of a test.
class LoadedCode {
 public:
  explicit LoadedCode(const std::string& path) : _handle(::dlopen(path.c_str(), RTLD_NOW)) {
    if (_handle == nullptr) {
      ADD_FAILURE() << ::dlerror();  // NOLINT(concurrency-mt-unsafe)
    }
  }
  ~LoadedCode() {
    if (_handle != nullptr) {
      ::dlclose(_handle);
    }
  }
  LoadedCode(const LoadedCode&) = delete;
  LoadedCode& operator=(const LoadedCode&) = delete;

  const void* function() const { return ::dlsym(_handle, "sampleFunction"); }

 private:
  void* _handle;
};

/// Makes a bundle with code in it and gives the path of the code.
std::string makeBundle(const TemporaryFolder& folder) {
  folder.write("Sample.bundle/Info.plist",
               information("<key>BundleIdentifier</key><string>org.example.sample</string>"
                           "<key>BundleExecutable</key><string>sample.so</string>"
                           "<key>BundlePrincipalClass</key><string>Sample</string>"
                           "<key>BundleVersion</key><string>1.2</string>"));
  std::filesystem::copy_file(SAMPLE_CODE, folder.path("Sample.bundle/sample.so"));
  return folder.path("Sample.bundle/sample.so");
}

TEST(Bundle, readsItsInformationList) {
  const TemporaryFolder folder;
  const std::string code = makeBundle(folder);
  const auto bundle = Bundle::bundleWithPath(folder.path("Sample.bundle"));
  ASSERT_NE(bundle, nullptr);
  EXPECT_EQ(bundle->bundlePath(), folder.path("Sample.bundle"));
  EXPECT_EQ(bundle->bundleIdentifier(), "org.example.sample");
  EXPECT_EQ(bundle->principalClass(), "Sample");
  EXPECT_EQ(bundle->executablePath(), code);
  EXPECT_EQ(bundle->infoDictionary()[Bundle::versionKey].stringValue(), "1.2");
}

TEST(Bundle, aFolderWithoutAReadableListIsNone) {
  const TemporaryFolder folder;
  EXPECT_EQ(Bundle::bundleWithPath(folder.path()), nullptr);
  EXPECT_EQ(Bundle::bundleWithPath(folder.path("missing")), nullptr);
  EXPECT_EQ(Bundle::bundleWithPath(folder.write("file", "")), nullptr);
  folder.write("Info.plist", "garbage");
  EXPECT_EQ(Bundle::bundleWithPath(folder.path()), nullptr);
  folder.write("Info.plist", "<plist><array/></plist>");
  EXPECT_EQ(Bundle::bundleWithPath(folder.path()), nullptr);
}

TEST(Bundle, withAnEmptyListEverythingIsEmptyOrAbsent) {
  const TemporaryFolder folder;
  folder.write("Info.plist", information(""));
  const auto bundle = Bundle::bundleWithPath(folder.path());
  ASSERT_NE(bundle, nullptr);
  EXPECT_EQ(bundle->bundleIdentifier(), "");
  EXPECT_EQ(bundle->principalClass(), "");
  EXPECT_EQ(bundle->executablePath(), std::nullopt);
}

TEST(Bundle, entriesOfAnotherKindCountAsMissing) {
  const TemporaryFolder folder;
  folder.write("Info.plist", information("<key>BundleIdentifier</key><integer>1</integer>"
                                         "<key>BundleExecutable</key><array/>"
                                         "<key>BundlePrincipalClass</key><true/>"));
  const auto bundle = Bundle::bundleWithPath(folder.path());
  ASSERT_NE(bundle, nullptr);
  EXPECT_EQ(bundle->bundleIdentifier(), "");
  EXPECT_EQ(bundle->principalClass(), "");
  EXPECT_EQ(bundle->executablePath(), std::nullopt);
}

TEST(Bundle, anExecutableNameNeverLeavesTheFolder) {
  const TemporaryFolder folder;
  for (const char* name : {"", ".", "..", "/bin/sh", "../code.so", "a/../../code.so", "sub/code.so",
                           "code.so/", "./code.so"}) {
    folder.write("Info.plist", executableNamed(name));
    const auto bundle = Bundle::bundleWithPath(folder.path());
    ASSERT_NE(bundle, nullptr);
    EXPECT_EQ(bundle->executablePath(), std::nullopt) << name;
  }
  for (const std::string name : {"...", "..code", "Co de.so", "code"}) {
    folder.write("Info.plist", executableNamed(name));
    EXPECT_EQ(Bundle::bundleWithPath(folder.path())->executablePath(), folder.path(name));
  }
}

TEST(Bundle, findsResourcesInTheLanguageFolderFirst) {
  const TemporaryFolder folder;
  folder.write("Info.plist", information(""));
  folder.write("Resources/Help/page.html", "");
  folder.write("Resources/German.lproj/Help/page.html", "");
  folder.write("Resources/list.plist", "");
  folder.write("Resources/deep/list.plist", "");
  const auto bundle = Bundle::bundleWithPath(folder.path());
  ASSERT_NE(bundle, nullptr);
  const auto none = std::nullopt;
  EXPECT_EQ(bundle->pathForResource("Help", none, none, "German"),
            folder.path("Resources/German.lproj/Help"));
  EXPECT_EQ(bundle->pathForResource("Help", none, none, "French"), folder.path("Resources/Help"));
  EXPECT_EQ(bundle->pathForResource("Help", none, none, none), folder.path("Resources/Help"));
  EXPECT_EQ(bundle->pathForResource("Help", "", "", ""), folder.path("Resources/Help"));
  EXPECT_EQ(bundle->pathForResource("list", "plist", none, "German"),
            folder.path("Resources/list.plist"));
  EXPECT_EQ(bundle->pathForResource("list", "plist", "deep", none),
            folder.path("Resources/deep/list.plist"));
  EXPECT_EQ(bundle->pathForResource("missing", none, none, "German"), std::nullopt);
  EXPECT_EQ(bundle->pathForResource("list", none, none, none), std::nullopt);
}

TEST(Bundle, findsNoResourcesOutsideItsResourceFolder) {
  const TemporaryFolder folder;
  folder.write("Info.plist", information(""));
  folder.write("Resources/inside.html", "");
  folder.write("ResourcesToo/outside.html", "");
  const auto bundle = Bundle::bundleWithPath(folder.path());
  ASSERT_NE(bundle, nullptr);
  const auto none = std::nullopt;
  for (const std::string name :
       {"", ".", "..", "../Info.plist", "../ResourcesToo/outside.html", "../../../../etc/passwd"}) {
    EXPECT_EQ(bundle->pathForResource(name, none, none, none), std::nullopt) << name;
    EXPECT_EQ(bundle->pathForResource(name, none, none, "German"), std::nullopt) << name;
  }
  EXPECT_EQ(bundle->pathForResource("Info", "plist", "..", none), std::nullopt);
  EXPECT_EQ(bundle->pathForResource(std::string("inside.html\0", 12), none, none, none),
            std::nullopt);
  EXPECT_TRUE(bundle->pathForResource("inside.html", none, none, "../../etc"));
}

TEST(Bundle, anExecutableNameWithANULIsRefused) {
  const TemporaryFolder folder;
  // One dictionary of two strings, the second of them "a\0b".
  std::string list = "bplist00";
  list += "\xD1\x01\x02";
  list +=
      "\x5F\x10\x10"
      "BundleExecutable";
  list += std::string(
      "\x53"
      "a\0b",
      4);
  list += std::string("\x08\x0B\x1E", 3);
  list += std::string(6, '\0') + "\x01\x01";
  list += std::string(7, '\0') + "\x03" + std::string(8, '\0') + std::string(7, '\0') + "\x22";
  folder.write("Info.plist", list);
  const auto bundle = Bundle::bundleWithPath(folder.path());
  ASSERT_NE(bundle, nullptr);
  EXPECT_EQ(bundle->infoDictionary()[Bundle::executableKey].stringValue(), std::string("a\0b", 3));
  EXPECT_EQ(bundle->executablePath(), std::nullopt);
}

TEST(Bundle, codeKnowsTheBundleItWasLoadedFrom) {
  const TemporaryFolder folder;
  const LoadedCode code(makeBundle(folder));
  const auto bundle = Bundle::bundleWithCode(code.function());
  ASSERT_NE(bundle, nullptr);
  EXPECT_EQ(bundle->bundlePath(), folder.path("Sample.bundle"));
  EXPECT_EQ(bundle->bundleIdentifier(), "org.example.sample");
}

TEST(Bundle, codeLoadedByARelativePathKnowsItsBundleToo) {
  const TemporaryFolder folder;
  makeBundle(folder);
  const auto before = std::filesystem::current_path();
  std::filesystem::current_path(folder.path());
  const LoadedCode code("./Sample.bundle/sample.so");
  const auto bundle = Bundle::bundleWithCode(code.function());
  std::filesystem::current_path(before);
  ASSERT_NE(bundle, nullptr);
  EXPECT_EQ(bundle->bundleIdentifier(), "org.example.sample");
  EXPECT_TRUE(bundle->bundlePath().starts_with('/')) << bundle->bundlePath();
}

TEST(Bundle, codeOutsideABundleHasNone) {
  const TemporaryFolder folder;
  std::filesystem::copy_file(SAMPLE_CODE, folder.path("sample.so"));
  const LoadedCode code(folder.path("sample.so"));
  EXPECT_EQ(Bundle::bundleWithCode(code.function()), nullptr);
  EXPECT_EQ(Bundle::bundleWithCode(nullptr), nullptr);
  const int onTheStack = 0;
  EXPECT_EQ(Bundle::bundleWithCode(&onTheStack), nullptr);
}

TEST(Bundle, aProgramKnowsTheBundleItStartedFromHoweverItWasCalled) {
  const TemporaryFolder folder;
  folder.write("Program.bundle/Info.plist",
               information("<key>BundleIdentifier</key><string>org.example.program</string>"));
  std::filesystem::copy_file(BUNDLE_PROGRAM, folder.path("Program.bundle/program"));
  const auto launch = [&](const std::string& line) {
    return systemProcessLauncher()->launchAndWait(
        "/bin/sh", {"-c", "cd \"$1\" && " + line, "shell", folder.path("Program.bundle")});
  };
  EXPECT_EQ(launch("\"$1\"/program org.example.program"), 0);
  EXPECT_EQ(launch("./program org.example.program"), 0);
  EXPECT_EQ(launch("P=$1; cd / && PATH=$P program org.example.program"), 0);
  EXPECT_EQ(launch("./program org.example.other"), 1);
}

int codeOfThisProgram() { return 7; }

TEST(Bundle, theProgramsOwnCodeIsNotLookedForInTheWorkingFolder) {
  const TemporaryFolder folder;
  folder.write("Info.plist", information(""));
  const auto before = std::filesystem::current_path();
  std::filesystem::current_path(folder.path());
  const auto bundle = Bundle::bundleWithCode(reinterpret_cast<const void*>(&codeOfThisProgram));
  std::filesystem::current_path(before);
  EXPECT_EQ(bundle, nullptr);
  EXPECT_EQ(codeOfThisProgram(), 7);
}

}  // namespace
}  // namespace platform
