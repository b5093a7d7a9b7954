// What tests of URL sessions share.
#pragma once

#include <gtest/gtest.h>

#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "platform/Environment.h"
#include "platform/URLError.h"
#include "platform/URLSession.h"
#include "tests/platform/TemporaryFolder.h"
#include "tests/support/Latch.h"

namespace tests {

inline platform::URL urlOf(const std::string& text) {
  return platform::URL::URLWithString(text).value();
}

inline platform::URLRequest requestOf(const std::string& url,
                                      platform::URLRequestCachePolicy policy =
                                          platform::URLRequestCachePolicy::useProtocolCachePolicy) {
  return platform::URLRequest::requestWithURL(urlOf(url), policy).value();
}

/// How a transfer ended. The code of its error; 0 where there was none.
struct Outcome {
  std::optional<platform::Data> data;
  std::shared_ptr<const platform::URLResponse> response;
  std::optional<platform::Error> error;

  int status() const { return response == nullptr ? 0 : response->statusCode(); }
  std::string body() const { return data ? std::string(data->view()) : std::string(); }
  long code() const { return error ? error->code : 0; }
};

/// Waits for the end of one transfer of a session.
inline Outcome fetch(const std::shared_ptr<platform::URLSession>& session,
                     platform::URLRequest request) {
  auto outcome = std::make_shared<Outcome>();
  auto done = std::make_shared<Latch>();
  const auto task = session->dataTaskWithRequest(
      std::move(request), [outcome, done](std::optional<platform::Data> data,
                                          std::shared_ptr<const platform::URLResponse> response,
                                          std::optional<platform::Error> error) {
        *outcome = {std::move(data), std::move(response), std::move(error)};
        done->open();
      });
  task->resume();
  EXPECT_TRUE(done->wait());
  return *outcome;
}

/// A delegate that writes down what it hears, and answers as it is told.
class RecordingDelegate : public platform::URLSessionDelegate {
 public:
  using Session = std::shared_ptr<platform::URLSession>;
  using Task = std::shared_ptr<platform::URLSessionDataTask>;
  using Response = std::shared_ptr<const platform::URLResponse>;

  // What to do about each; the default answer where nothing is set.
  std::function<void(const platform::URLRequest&, const RedirectHandler&)> onRedirect;
  std::function<void(const Task&, const Response&, const DispositionHandler&)> onResponse;
  std::function<void(const std::shared_ptr<const platform::CachedURLResponse>&,
                     const CacheHandler&)>
      onWillCache;
  std::function<void(const Task&, const platform::Data&)> onData;
  std::function<void(const Task&)> onCompletion;

  Latch responded;
  Latch completed;
  Latch invalid;
  Counter pieces;

  std::vector<std::string> events() const {
    const std::lock_guard lock(_mutex);
    return _events;
  }
  std::string body() const {
    const std::lock_guard lock(_mutex);
    return _body;
  }
  std::optional<platform::Error> error() const {
    const std::lock_guard lock(_mutex);
    return _error;
  }
  long code() const { return error() ? error()->code : 0; }

  void URLSessionTaskWillPerformHTTPRedirection(const Session&, const Task&,
                                                const Response& response,
                                                const platform::URLRequest& newRequest,
                                                const RedirectHandler& handler) override {
    _note("redirect " + std::to_string(response->statusCode()));
    if (onRedirect) {
      onRedirect(newRequest, handler);
    } else {
      handler(newRequest);
    }
  }

  void URLSessionDataTaskDidReceiveResponse(const Session&, const Task& task,
                                            const Response& response,
                                            const DispositionHandler& handler) override {
    _note("response " + std::to_string(response->statusCode()));
    responded.open();
    if (onResponse) {
      onResponse(task, response, handler);
    } else {
      handler(platform::URLSessionResponseDisposition::allow);
    }
  }

  void URLSessionDataTaskWillCacheResponse(
      const Session&, const Task&,
      const std::shared_ptr<const platform::CachedURLResponse>& proposedResponse,
      const CacheHandler& handler) override {
    _note("will cache");
    if (onWillCache) {
      onWillCache(proposedResponse, handler);
    } else {
      handler(proposedResponse);
    }
  }

  void URLSessionDataTaskDidReceiveData(const Session&, const Task& task,
                                        const platform::Data& data) override {
    {
      const std::lock_guard lock(_mutex);
      if (_events.empty() || _events.back() != "data") {
        _events.emplace_back("data");
      }
      if (keepsBody) {
        _body.append(data.view());
      }
    }
    if (onData) {
      onData(task, data);
    }
    pieces.add();
  }

  void URLSessionTaskDidCompleteWithError(const Session&, const Task& task,
                                          const std::optional<platform::Error>& error) override {
    {
      const std::lock_guard lock(_mutex);
      _events.emplace_back("completion");
      _error = error;
    }
    if (onCompletion) {
      onCompletion(task);
    }
    completed.open();
  }

  void URLSessionDidBecomeInvalidWithError(const Session&,
                                           const std::optional<platform::Error>&) override {
    _note("invalid");
    invalid.open();
  }

  bool keepsBody = true;

 private:
  void _note(std::string event) {
    const std::lock_guard lock(_mutex);
    _events.push_back(std::move(event));
  }

  mutable std::mutex _mutex;
  std::vector<std::string> _events;
  std::string _body;
  std::optional<platform::Error> _error;
};

/// A world with a caches folder and a shared cache of its own, on the machine's clock.
class SessionTest : public ::testing::Test {
 protected:
  SessionTest() : _override(_environment(nullptr)) {}
  explicit SessionTest(std::shared_ptr<platform::Clock> clock,
                       std::shared_ptr<platform::FileManager> files = nullptr)
      : _override(_environment(std::move(clock), std::move(files))) {}

  platform::Environment _environment(std::shared_ptr<platform::Clock> clock,
                                     std::shared_ptr<platform::FileManager> files = nullptr) {
    platform::Environment environment = platform::Environment::system();
    environment.cachesDirectory = folder.path("caches");
    environment.log = log;
    if (clock != nullptr) {
      environment.clock = std::move(clock);
    }
    if (files != nullptr) {
      environment.files = std::move(files);
    }
    return environment;
  }

  static std::shared_ptr<platform::URLSession> sessionWithDelegate(
      const std::shared_ptr<platform::URLSessionDelegate>& delegate) {
    return platform::URLSession::sessionWithConfiguration(
        platform::URLSessionConfiguration::defaultSessionConfiguration(), delegate);
  }

  TemporaryFolder folder;
  std::shared_ptr<platform::CapturingLogSink> log = std::make_shared<platform::CapturingLogSink>();

 private:
  platform::EnvironmentOverride _override;
};

}  // namespace tests
