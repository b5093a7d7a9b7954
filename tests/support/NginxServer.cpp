#include "tests/support/NginxServer.h"

#include <sys/stat.h>
#include <sys/time.h>
#include <unistd.h>

#include <chrono>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <thread>

#include "tests/support/Latch.h"
#include "tests/support/Sockets.h"

namespace tests {

namespace {

constexpr const char* program = "/usr/sbin/nginx";
constexpr int attempts = 20;
/// Served beside the files, so that it is certain who listens.
constexpr const char* signPath = "/.server-of-the-test";

std::string contents(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), {}};
}

}  // namespace

NginxServer::NginxServer(std::string directives, std::optional<TestAuthority::Identity> identity)
    : _directives(std::move(directives)), _identity(std::move(identity)) {
  for (const char* name : {"files", "work", "private"}) {
    std::filesystem::create_directory(_folder.path(name));
  }
  if (::geteuid() == 0) {
    // The server is nobody then, and has to read and write here.
    ::chmod(_folder.path().c_str(), 0755);
    if (::chown(_folder.path("work").c_str(), 65534, 65534) != 0) {
      throw std::runtime_error("cannot give the server its folder");
    }
  }
  for (int attempt = 0; attempt < attempts; ++attempt) {
    _port = freePort();
    if (_tryToStart()) {
      return;
    }
  }
  throw std::runtime_error("nginx did not start: " + contents(_folder.path("work/output")));
}

NginxServer::~NginxServer() = default;

std::string NginxServer::_configuration() const {
  const std::string work = _folder.path("work");
  std::string text = "daemon off;\nmaster_process off;\nworker_processes 1;\npid " + work +
                     "/nginx.pid;\nerror_log " + work +
                     "/error.log;\nevents { worker_connections 256; }\nhttp {\n";
  for (const char* kind : {"client_body", "proxy", "fastcgi", "uwsgi", "scgi"}) {
    text += "  " + std::string(kind) + "_temp_path " + work + "/" + kind + ";\n";
  }
  text += "  log_format short '$request_method $request_uri $status $body_bytes_sent';\n";
  text += "  access_log " + work + "/access.log short;\n";
  text += "  types { text/html html; application/json json; }\n";
  text += "  default_type application/octet-stream;\n";
  text += "  server {\n    listen 127.0.0.1:" + std::to_string(_port) +
          std::string(_identity ? " ssl" : "") + ";\n";
  if (_identity) {
    text += "    ssl_certificate " + _folder.path("private/server.pem") + ";\n";
    text += "    ssl_certificate_key " + _folder.path("private/server.key") + ";\n";
  }
  text += "    root " + folder() + ";\n    location / { }\n";
  text += "    location = " + std::string(signPath) + " { access_log off; return 200 '" +
          _folder.path() + "'; }\n";
  text += _directives + "\n  }\n}\n";
  return text;
}

bool NginxServer::_tryToStart() {
  if (_identity) {
    // As nobody the server cannot read where the authority keeps them.
    writePrivate("server.pem", contents(_identity->certificateFile));
    writePrivate("server.key", contents(_identity->keyFile));
  }
  const std::string file = _folder.write("nginx.conf", _configuration());
  const std::string work = _folder.path("work");
  _process = std::make_unique<ChildProcess>(
      program,
      std::vector<std::string>{"-p", work, "-c", file, "-e", _folder.path("work/error.log")},
      _folder.path("work/output"), true);
  const auto limit = std::chrono::steady_clock::now() + patience;
  while (_process->isRunning() && std::chrono::steady_clock::now() < limit) {
    if (_identity) {
      // The sign cannot be asked for without TLS; an nginx that speaks it says so in plain words.
      if (plainExchange(_port, "GET / HTTP/1.0\r\n\r\n").find("HTTPS port") != std::string::npos &&
          _process->isRunning()) {
        std::filesystem::resize_file(_folder.path("work/access.log"), 0);
        return true;
      }
    } else if (plainExchange(_port, "GET " + std::string(signPath) + " HTTP/1.0\r\n\r\n")
                   .ends_with(_folder.path())) {
      return true;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
  _process.reset();
  return false;
}

std::string NginxServer::URL(std::string_view path) const {
  return std::string(_identity ? "https" : "http") + "://127.0.0.1:" + std::to_string(_port) +
         std::string(path);
}

void NginxServer::write(const std::string& name, std::string_view content) const {
  const std::string temporary = _folder.write("incoming", content);
  const std::filesystem::path target = folder() + "/" + name;
  std::filesystem::create_directories(target.parent_path());
  std::filesystem::rename(temporary, target);
}

void NginxServer::remove(const std::string& name) const {
  std::filesystem::remove(folder() + "/" + name);
}

void NginxServer::setModified(const std::string& name, long seconds) const {
  const timeval times[2] = {{seconds, 0}, {seconds, 0}};
  if (::utimes((folder() + "/" + name).c_str(), times) != 0) {
    throw std::runtime_error("cannot set the time of " + name);
  }
}

std::string NginxServer::writePrivate(const std::string& name, std::string_view content) const {
  return _folder.write("private/" + name, content);
}

void NginxServer::stop() { _process.reset(); }

void NginxServer::start() {
  for (int attempt = 0; attempt < attempts; ++attempt) {
    if (_tryToStart()) {
      return;
    }
  }
  throw std::runtime_error("nginx did not start again: " + contents(_folder.path("work/output")));
}

std::vector<std::string> NginxServer::accessLog() const {
  std::ifstream file(_folder.path("work/access.log"));
  std::vector<std::string> lines;
  std::string line;
  while (std::getline(file, line)) {
    lines.push_back(line);
  }
  return lines;
}

std::vector<std::string> NginxServer::waitForAccessLog(size_t count) const {
  const auto limit = std::chrono::steady_clock::now() + patience;
  std::vector<std::string> lines = accessLog();
  while (lines.size() < count) {
    if (std::chrono::steady_clock::now() > limit) {
      throw std::runtime_error("the server was not asked that often");
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
    lines = accessLog();
  }
  return lines;
}

std::string nginxPasswordLine(const std::string& user, const std::string& password) {
  return user + ":{PLAIN}" + password + "\n";
}

}  // namespace tests
