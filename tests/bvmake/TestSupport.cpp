#include "TestSupport.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>

namespace bvmake {

namespace fs = std::filesystem;

TemporaryFolder::TemporaryFolder() {
  std::string pattern = (fs::temp_directory_path() / "bvmake-test-XXXXXX").string();
  if (mkdtemp(pattern.data()) == nullptr) {
    throw std::runtime_error("cannot make " + pattern);
  }
  _path = fs::canonical(pattern).string();
}

TemporaryFolder::~TemporaryFolder() {
  std::error_code ignored;
  fs::remove_all(_path, ignored);
}

std::string TemporaryFolder::write(std::string_view relative, std::string_view contents) const {
  std::string path = *this / relative;
  fs::create_directories(fs::path(path).parent_path());
  std::ofstream file(path, std::ios::binary);
  file << contents;
  file.close();
  if (!file) {
    throw std::runtime_error("cannot write " + path);
  }
  return path;
}

void TemporaryFolder::makeFolder(std::string_view relative) const {
  fs::create_directories(*this / relative);
}

void TemporaryFolder::makeLink(std::string_view target, std::string_view relative) const {
  fs::create_symlink(target, *this / relative);
}

std::string contentsOfFile(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

std::vector<std::string> bodyTexts(const Page& page) {
  std::vector<std::string> texts;
  for (const TextBlock& block : page.body) {
    texts.push_back(block.text);
  }
  return texts;
}

ChildResult runBvmake(const std::vector<std::string>& arguments) {
  const TemporaryFolder folder;
  const std::string outputPath = folder / "output";
  const std::string errorsPath = folder / "errors";
  std::vector<std::string> words{BVMAKE_PROGRAM};
  words.insert(words.end(), arguments.begin(), arguments.end());
  std::vector<char*> pointers;
  pointers.reserve(words.size() + 1);
  for (std::string& word : words) {
    pointers.push_back(word.data());
  }
  pointers.push_back(nullptr);

  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  const int flags = O_WRONLY | O_CREAT | O_TRUNC;
  posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, outputPath.c_str(), flags, 0600);
  posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, errorsPath.c_str(), flags, 0600);
  pid_t child = 0;
  const int failure =
      posix_spawn(&child, BVMAKE_PROGRAM, &actions, nullptr, pointers.data(), environ);
  posix_spawn_file_actions_destroy(&actions);
  if (failure != 0) {
    throw std::runtime_error("cannot start " BVMAKE_PROGRAM);
  }
  int status = 0;
  waitpid(child, &status, 0);
  ChildResult result;
  result.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  result.output = contentsOfFile(outputPath);
  result.errors = contentsOfFile(errorsPath);
  return result;
}

}  // namespace bvmake
