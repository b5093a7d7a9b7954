// A content service that says what the test tells it to say.
#pragma once

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "host/Zebrine/RNXBook.h"
#include "host/Zebrine/RNXObjectManager.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Error.h"
#include "platform/ThreadSafety.h"

namespace tests {

/// Answers at once, or when it is told to. Thread-safety: internally synchronised.
class ScriptedObjectManager : public RNXObjectManager {
 public:
  struct Answer {
    std::shared_ptr<RNXBook> book;
    std::optional<platform::Error> error;
  };

  /// For a book's identifier; books that have none get an answer without book and error.
  void setAnswer(const std::string& bookID, Answer answer) {
    const platform::MutexLock lock(_mutex);
    _answers[bookID] = std::move(answer);
  }
  /// From now on requests wait for release().
  void hold() {
    const platform::MutexLock lock(_mutex);
    _holds = true;
  }
  void release() {
    std::vector<std::function<void()>> held;
    {
      const platform::MutexLock lock(_mutex);
      _holds = false;
      held.swap(_held);
    }
    for (const auto& answer : held) {
      answer();
    }
  }
  size_t requestCount() const {
    const platform::MutexLock lock(_mutex);
    return _requestCount;
  }

  void _requestBookWithHelpBook(const std::shared_ptr<ZEBHelpBook>& helpBook,
                                CompletionHandler completionHandler) override {
    auto answer = [found = _answerFor(helpBook), handler = std::move(completionHandler)] {
      handler(found.book, found.error);
    };
    {
      const platform::MutexLock lock(_mutex);
      ++_requestCount;
      if (_holds) {
        _held.push_back(std::move(answer));
        return;
      }
    }
    answer();
  }

 private:
  Answer _answerFor(const std::shared_ptr<ZEBHelpBook>& helpBook) const {
    const platform::MutexLock lock(_mutex);
    const auto found = helpBook ? _answers.find(helpBook->bookID()) : _answers.end();
    return found == _answers.end() ? Answer() : found->second;
  }

  mutable platform::Mutex _mutex;
  std::map<std::string, Answer> _answers GUARDED_BY(_mutex);
  bool _holds GUARDED_BY(_mutex) = false;
  size_t _requestCount GUARDED_BY(_mutex) = 0;
  std::vector<std::function<void()>> _held GUARDED_BY(_mutex);
};

}  // namespace tests
