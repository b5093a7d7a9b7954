#include "platform/Files.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <thread>

#include "tests/platform/TemporaryFolder.h"

namespace platform {
namespace {

using tests::TemporaryFolder;

std::string nameWithNUL() { return std::string("/tmp\0/x", 7); }

TEST(FileManager, tellsFilesFromFolders) {
  const TemporaryFolder folder;
  const FileManager files;
  bool isDirectory = false;
  EXPECT_TRUE(files.fileExistsAtPath(folder.path(), &isDirectory));
  EXPECT_TRUE(isDirectory);
  EXPECT_TRUE(files.fileExistsAtPath(folder.write("a", "x"), &isDirectory));
  EXPECT_FALSE(isDirectory);
  EXPECT_FALSE(files.fileExistsAtPath(folder.path("missing")));
  EXPECT_FALSE(files.fileExistsAtPath(""));
}

TEST(FileManager, readsAFileMappedAndCopied) {
  const TemporaryFolder folder;
  const FileManager files;
  const std::string path = folder.write("a", std::string(100000, 'x'));
  EXPECT_EQ(files.contentsMappedAtPath(path)->length(), 100000U);
  EXPECT_EQ(*files.contentsMappedAtPath(path), *files.contentsAtPath(path));
}

TEST(FileManager, readsAnEmptyFileAsEmptyData) {
  const TemporaryFolder folder;
  const FileManager files;
  const std::string path = folder.write("empty", "");
  EXPECT_TRUE(files.contentsMappedAtPath(path)->empty());
  EXPECT_TRUE(files.contentsAtPath(path)->empty());
}

TEST(FileManager, readsFilesOfTheKernelThatHaveNoLength) {
  EXPECT_FALSE(FileManager().contentsAtPath("/proc/self/cmdline")->empty());
  EXPECT_FALSE(FileManager().contentsMappedAtPath("/proc/self/cmdline")->empty());
}

TEST(FileManager, mappingOutlivesReplacementAndRemovalOfTheFile) {
  const TemporaryFolder folder;
  const FileManager files;
  const std::string path = folder.write("a", "old");
  const Data data = *files.contentsMappedAtPath(path);
  EXPECT_FALSE(files.writeAtomically(path, Data::copy("new")));
  EXPECT_EQ(data.view(), "old");
  EXPECT_FALSE(files.removeItem(path));
  EXPECT_EQ(data.view(), "old");
}

TEST(FileManager, readingWhatIsNoReadableFileTellsWhy) {
  const TemporaryFolder folder;
  const FileManager files;
  Error error;
  EXPECT_FALSE(files.contentsAtPath(folder.path("missing"), &error));
  EXPECT_EQ(error.domain, posixErrorDomain);
  EXPECT_EQ(error.code, ENOENT);
  EXPECT_NE(error.description.find("missing"), std::string::npos);
  EXPECT_FALSE(files.contentsMappedAtPath(folder.path(), &error));
  EXPECT_EQ(error.code, EISDIR);
  EXPECT_FALSE(files.contentsAtPath(nameWithNUL(), &error));
  EXPECT_EQ(error.code, ENOENT);
}

TEST(FileManager, readingAPipeWithoutAWriterIsRefusedAtOnce) {
  const TemporaryFolder folder;
  const std::string pipe = folder.path("pipe");
  ASSERT_EQ(::mkfifo(pipe.c_str(), 0600), 0);
  Error error;
  EXPECT_FALSE(FileManager().contentsAtPath(pipe, &error));
  EXPECT_EQ(error.code, EINVAL);
}

TEST(FileManager, writeAtomicallyReplacesTheWholeFile) {
  const TemporaryFolder folder;
  const FileManager files;
  const std::string path = folder.write("a", "a longer earlier text");
  EXPECT_FALSE(files.writeAtomically(path, Data::copy("short")));
  EXPECT_EQ(files.contentsAtPath(path)->view(), "short");
  EXPECT_EQ(*files.namesInDirectory(folder.path()), (std::vector<std::string>{"a"}));
}

TEST(FileManager, failedWriteKeepsTheOldFileAndLeavesNoTemporaryOne) {
  const TemporaryFolder folder;
  const FileManager files;
  // A folder in the place of the file makes the last step, the rename, fail.
  const std::string path = folder.path("taken");
  ASSERT_FALSE(files.createDirectoryWithParents(path + "/inside"));
  const auto error = files.writeAtomically(path, Data::copy("x"));
  ASSERT_TRUE(error);
  EXPECT_EQ(*files.namesInDirectory(folder.path()), (std::vector<std::string>{"taken"}));
  EXPECT_EQ(files.writeAtomically(folder.path("no/such/folder"), Data::copy("x"))->code, ENOENT);
  EXPECT_EQ(files.writeAtomically(nameWithNUL(), Data::copy("x"))->code, ENOENT);
}

TEST(FileManager, readersSeeTheOldOrTheNewFileNeverAMixture) {
  const TemporaryFolder folder;
  const FileManager files;
  const std::string path = folder.write("a", std::string(50000, 'a'));
  std::thread writer([&] {
    for (int i = 0; i < 40; ++i) {
      ASSERT_FALSE(
          files.writeAtomically(path, Data::adopt(std::string(50000, i % 2 == 0 ? 'b' : 'a'))));
    }
  });
  for (int i = 0; i < 200; ++i) {
    const Data data = *files.contentsAtPath(path);
    ASSERT_EQ(data.length(), 50000U);
    ASSERT_EQ(data.view().find_first_not_of(data.view()[0]), std::string_view::npos);
  }
  writer.join();
}

TEST(FileManager, createsParentFoldersAndAcceptsExistingOnes) {
  const TemporaryFolder folder;
  const FileManager files;
  EXPECT_FALSE(files.createDirectoryWithParents(folder.path("a/b/c")));
  EXPECT_FALSE(files.createDirectoryWithParents(folder.path("a/b/c")));
  folder.write("file", "");
  EXPECT_TRUE(files.createDirectoryWithParents(folder.path("file")));
  EXPECT_TRUE(files.createDirectoryWithParents(folder.path("file/below")));
}

TEST(FileManager, createsOneFolderWhereNothingIsAndTheParentExists) {
  const TemporaryFolder folder;
  const FileManager files;
  EXPECT_FALSE(files.createDirectory(folder.path("a")));
  bool isDirectory = false;
  EXPECT_TRUE(files.fileExistsAtPath(folder.path("a"), &isDirectory));
  EXPECT_TRUE(isDirectory);
  EXPECT_EQ(files.createDirectory(folder.path("a"))->code, EEXIST);
  EXPECT_EQ(files.createDirectory(folder.path("b/c"))->code, ENOENT);
  EXPECT_FALSE(files.fileExistsAtPath(folder.path("b")));
  folder.write("file", "");
  EXPECT_EQ(files.createDirectory(folder.path("file"))->code, EEXIST);
  EXPECT_EQ(files.createDirectory(nameWithNUL())->code, ENOENT);
}

TEST(FileManager, copiesFilesOnly) {
  const TemporaryFolder folder;
  const FileManager files;
  const std::string from = folder.write("from", "content");
  EXPECT_FALSE(files.copyItem(from, folder.path("to")));
  EXPECT_EQ(files.contentsAtPath(folder.path("to"))->view(), "content");
  EXPECT_EQ(files.copyItem(from, folder.path("to"))->code, EEXIST);
  EXPECT_EQ(files.copyItem(folder.path("missing"), folder.path("x"))->code, ENOENT);
  EXPECT_EQ(files.copyItem(folder.path(), folder.path("x"))->code, EISDIR);
}

TEST(FileManager, removesAFolderWithItsContentButDoesNotFollowLinks) {
  const TemporaryFolder folder;
  const FileManager files;
  const std::string kept = folder.write("kept/file", "x");
  folder.write("gone/sub/file", "x");
  ASSERT_EQ(::symlink(folder.path("kept").c_str(), folder.path("gone/link").c_str()), 0);
  EXPECT_FALSE(files.removeItem(folder.path("gone")));
  EXPECT_FALSE(files.fileExistsAtPath(folder.path("gone")));
  EXPECT_TRUE(files.fileExistsAtPath(kept));
  EXPECT_EQ(files.removeItem(folder.path("gone"))->code, ENOENT);
}

TEST(FileManager, tellsTheModificationDate) {
  const TemporaryFolder folder;
  const std::string path = folder.write("a", "x");
  const timespec times[2] = {{1000000000, 0}, {1000000000, 500000000}};
  ASSERT_EQ(::utimensat(AT_FDCWD, path.c_str(), times, 0), 0);
  const auto date = FileManager().modificationDate(path);
  ASSERT_TRUE(date);
  EXPECT_EQ(date->time_since_epoch(), std::chrono::milliseconds(1000000000500));
  EXPECT_FALSE(FileManager().modificationDate(folder.path("missing")));
}

TEST(FileManager, listsNamesSorted) {
  const TemporaryFolder folder;
  folder.write("b", "");
  folder.write("a", "");
  folder.write(".hidden", "");
  EXPECT_EQ(*FileManager().namesInDirectory(folder.path()),
            (std::vector<std::string>{".hidden", "a", "b"}));
  EXPECT_FALSE(FileManager().namesInDirectory(folder.path("missing")));
}

TEST(FailingFileManager, failsTheChosenOperationForTheChosenPaths) {
  const TemporaryFolder folder;
  const std::string path = folder.write("book/index", "x");
  FailingFileManager files;
  files.fail(FailingFileManager::Operation::read, EIO, "book");
  files.fail(FailingFileManager::Operation::write, ENOSPC, "index");
  files.fail(FailingFileManager::Operation::list, EACCES);
  Error error;
  EXPECT_FALSE(files.contentsMappedAtPath(path, &error));
  EXPECT_EQ(error.code, EIO);
  EXPECT_FALSE(files.contentsAtPath(path, &error));
  EXPECT_EQ(files.writeAtomically(path, Data())->code, ENOSPC);
  EXPECT_FALSE(files.writeAtomically(folder.path("other"), Data()));
  EXPECT_FALSE(files.namesInDirectory(folder.path()));
  files.recover();
  EXPECT_EQ(files.contentsAtPath(path, nullptr)->view(), "x");
}

TEST(FailingFileManager, failsEveryKindOfChange) {
  const TemporaryFolder folder;
  const std::string path = folder.write("a", "x");
  FailingFileManager files;
  files.fail(FailingFileManager::Operation::createDirectory, EROFS);
  files.fail(FailingFileManager::Operation::copy, EROFS, "target");
  files.fail(FailingFileManager::Operation::remove, EROFS);
  files.fail(FailingFileManager::Operation::modificationDate, EIO);
  EXPECT_EQ(files.createDirectoryWithParents(folder.path("b"))->code, EROFS);
  EXPECT_EQ(files.createDirectory(folder.path("b"))->code, EROFS);
  EXPECT_EQ(files.copyItem(path, folder.path("target"))->code, EROFS);
  EXPECT_EQ(files.removeItem(path)->code, EROFS);
  EXPECT_FALSE(files.modificationDate(path));
}

TEST(Paths, deletingTheLastComponent) {
  EXPECT_EQ(stringByDeletingLastPathComponent("/a/b/c"), "/a/b");
  EXPECT_EQ(stringByDeletingLastPathComponent("/a/b/c/"), "/a/b");
  EXPECT_EQ(stringByDeletingLastPathComponent("/a//b"), "/a");
  EXPECT_EQ(stringByDeletingLastPathComponent("/a"), "/");
  EXPECT_EQ(stringByDeletingLastPathComponent("/"), "/");
  EXPECT_EQ(stringByDeletingLastPathComponent("a"), "");
  EXPECT_EQ(stringByDeletingLastPathComponent(""), "");
}

TEST(Paths, lastComponentAndExtension) {
  EXPECT_EQ(lastPathComponent("/a/b.html"), "b.html");
  EXPECT_EQ(lastPathComponent("/a/b/"), "b");
  EXPECT_EQ(lastPathComponent("/"), "/");
  EXPECT_EQ(lastPathComponent(""), "");
  EXPECT_EQ(pathExtension("/a.b/c.tar.gz"), "gz");
  EXPECT_EQ(pathExtension("/a.b/c"), "");
  EXPECT_EQ(pathExtension("/a/.profile"), "");
  EXPECT_EQ(pathExtension("/a/end."), "");
}

TEST(Paths, appending) {
  EXPECT_EQ(stringByAppendingPathComponent("/a", "b"), "/a/b");
  EXPECT_EQ(stringByAppendingPathComponent("/a//", "//b"), "/a/b");
  EXPECT_EQ(stringByAppendingPathComponent("/", "b"), "/b");
  EXPECT_EQ(stringByAppendingPathComponent("", "b"), "b");
  EXPECT_EQ(stringByAppendingPathComponent("/a", ""), "/a");
  EXPECT_EQ(stringByAppendingPathExtension("/a/b", "plist"), "/a/b.plist");
  EXPECT_EQ(stringByAppendingPathExtension("/a/b/", "plist"), "/a/b.plist");
}

TEST(Paths, standardizing) {
  EXPECT_EQ(stringByStandardizingPath("/a/./b//c/"), "/a/b/c");
  EXPECT_EQ(stringByStandardizingPath("/a/../../b"), "/b");
  EXPECT_EQ(stringByStandardizingPath("a/../b"), "a/../b");
  EXPECT_EQ(stringByStandardizingPath("/.."), "/");
  EXPECT_EQ(stringByStandardizingPath(""), "");
}

}  // namespace
}  // namespace platform

TEST(FolderMark, isSeenAsLongAsItIsHeld) {
  const tests::TemporaryFolder folder;
  const platform::FileManager files;
  EXPECT_FALSE(files.folderIsMarked(folder.path()));
  auto mark = files.markFolder(folder.path());
  ASSERT_TRUE(mark);
  EXPECT_TRUE(files.folderIsMarked(folder.path()));
  auto second = files.markFolder(folder.path());
  ASSERT_TRUE(second);
  mark.reset();
  EXPECT_TRUE(files.folderIsMarked(folder.path()));
  second.reset();
  EXPECT_FALSE(files.folderIsMarked(folder.path()));
  EXPECT_TRUE(std::filesystem::is_empty(folder.path()));
}

TEST(FolderMark, isForFoldersThatAreThere) {
  const tests::TemporaryFolder folder;
  const platform::FileManager files;
  for (const std::string& path :
       {folder.path("none"), folder.write("file", "bytes"), std::string("/a\0b", 4)}) {
    EXPECT_FALSE(files.markFolder(path));
    EXPECT_FALSE(files.folderIsMarked(path));
  }
}

TEST(FolderMark, goesWithTheProcess) {
  const tests::TemporaryFolder folder;
  const platform::FileManager files;
  std::array<int, 2> ends{};
  ASSERT_EQ(::pipe(ends.data()), 0);
  const pid_t child = ::fork();
  if (child == 0) {
    const auto mark = files.markFolder(folder.path());
    const char answer = mark ? 'y' : 'n';
    (void)!::write(ends[1], &answer, 1);
    while (true) {
      ::pause();
    }
  }
  char answer = 0;
  ASSERT_EQ(::read(ends[0], &answer, 1), 1);
  EXPECT_EQ(answer, 'y');
  EXPECT_TRUE(files.folderIsMarked(folder.path()));
  ASSERT_EQ(::kill(child, SIGKILL), 0);
  ASSERT_EQ(::waitpid(child, nullptr, 0), child);
  EXPECT_FALSE(files.folderIsMarked(folder.path()));
  ::close(ends[0]);
  ::close(ends[1]);
}
