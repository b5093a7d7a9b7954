#include "tests/support/DigestGate.h"

#include <nettle/md5.h>

#include <array>

#include "platform/Digest.h"

namespace tests {

namespace {

constexpr const char* realm = "help";
constexpr const char* nonce = "7ypf/xlj9XXwfDPEoM4URrv/xwf94BcCAzFZH4GiTo0v";

std::string md5(std::string_view text) {
  md5_ctx context;
  md5_init(&context);
  md5_update(&context, text.size(), reinterpret_cast<const uint8_t*>(text.data()));
  std::array<uint8_t, MD5_DIGEST_SIZE> bytes{};
  md5_digest(&context, bytes.size(), bytes.data());
  std::string digits;
  for (const uint8_t byte : bytes) {
    digits += "0123456789abcdef"[byte >> 4];
    digits += "0123456789abcdef"[byte & 15];
  }
  return digits;
}

/// The value of a parameter, quoted or not; empty where it is missing.
std::string parameter(const std::string& field, const std::string& name) {
  for (size_t at = field.find(name + "="); at != std::string::npos;
       at = field.find(name + "=", at + 1)) {
    if (at == 0 || (field[at - 1] != ' ' && field[at - 1] != ',')) {
      continue;
    }
    const size_t begin = at + name.size() + 1;
    return field[begin] == '"' ? field.substr(begin + 1, field.find('"', begin + 1) - begin - 1)
                               : field.substr(begin, field.find(',', begin) - begin);
  }
  return {};
}

}  // namespace

std::string DigestGate::_digest(std::string_view text) const {
  return _algorithm == "MD5" ? md5(text) : platform::sha256Digest(text);
}

bool DigestGate::admits(const ScriptedRequest& request) const {
  const std::string field = request.header("Authorization").value_or("");
  if (!field.starts_with("Digest ") || parameter(field, "username") != _user ||
      parameter(field, "realm") != realm || parameter(field, "nonce") != nonce ||
      parameter(field, "uri") != request.target || parameter(field, "qop") != "auth") {
    return false;
  }
  const std::string secret = _digest(_user + ":" + realm + ":" + _password);
  const std::string what = _digest(request.method + ":" + request.target);
  return parameter(field, "response") ==
         _digest(secret + ":" + nonce + ":" + parameter(field, "nc") + ":" +
                 parameter(field, "cnonce") + ":auth:" + what);
}

std::string DigestGate::refusal() const {
  return httpAnswer(401, "who are you?",
                    {std::string("WWW-Authenticate: Digest realm=\"") + realm + "\", nonce=\"" +
                     nonce + "\", qop=\"auth\", algorithm=" + _algorithm});
}

ScriptedServer::Handler DigestGate::before(ScriptedServer::Handler handler) const {
  return [gate = *this, handler = std::move(handler)](const ScriptedRequest& request,
                                                      ScriptedConnection& connection) {
    if (gate.admits(request)) {
      handler(request, connection);
    } else {
      connection.send(gate.refusal());
    }
  };
}

}  // namespace tests
