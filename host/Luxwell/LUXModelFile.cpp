#include "host/Luxwell/LUXModelFile.h"

#include <utility>

#include "host/Luxwell/LUXModelView.h"
#include "platform/AbandonedFiles.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/MappingGuard.h"

namespace {

// Two changes of a file that follow one another this closely may bear the same time.
constexpr platform::Seconds timeGrain{1.0};

}  // namespace

LUXModelFile::LUXModelFile(std::string directoryPath)
    : _directoryPath(std::move(directoryPath)),
      _path(platform::stringByAppendingPathComponent(_directoryPath, fileName)) {}

std::shared_ptr<const LUXModelView> LUXModelFile::view() {
  const auto modified = platform::Environment::current()->files->modificationDate(_path);
  const platform::MutexLock lock(_mutex);
  if (!modified) {
    _view = nullptr;
    _modified.reset();
    return nullptr;
  }
  if (modified != _modified || (!_isSettled && _isCutOff())) {
    _open(*modified);
  } else if (!_isSettled) {
    _isSettled = platform::Environment::current()->clock->elapsed() - _opened > timeGrain;
  }
  return _view;
}

void LUXModelFile::_open(std::chrono::system_clock::time_point modified) {
  const auto environment = platform::Environment::current();
  _view = nullptr;
  _length = 0;
  if (const auto data = environment->files->contentsMappedAtPath(_path)) {
    _view = LUXModelView::viewWithData(platform::dataGuardedAgainstTruncation(*data));
    _length = data->length();
  }
  _modified = modified;
  _opened = environment->clock->elapsed();
  _isSettled = false;
}

bool LUXModelFile::_isCutOff() const {
  // The length of the file without touching the mapped bytes, which may be gone.
  const auto data = platform::Environment::current()->files->contentsMappedAtPath(_path);
  return (data ? data->length() : 0) != _length;
}

void LUXModelFile::distrust(const std::shared_ptr<const LUXModelView>& view) {
  const platform::MutexLock lock(_mutex);
  if (_view == view) {
    _view = nullptr;
  }
}

std::optional<platform::Error> LUXModelFile::makeDirectory() const {
  return platform::Environment::current()->files->createDirectoryWithParents(_directoryPath);
}

std::optional<platform::Error> LUXModelFile::write(const platform::Data& data) {
  std::optional<platform::Error> error = makeDirectory();
  if (!error) {
    error = platform::Environment::current()->files->writeAtomically(_path, data);
  }
  if (!error) {
    const platform::MutexLock lock(_mutex);
    _view = nullptr;
    _modified.reset();
  }
  return error;
}

void LUXModelFile::removeLeftovers() const {
  platform::removeAbandonedFiles(_directoryPath, fileName);
}
