#include "tests/support/TestAuthority.h"

#include "tests/support/ChildProcess.h"

namespace tests {

namespace {

constexpr const char* openssl = "/usr/bin/openssl";

}  // namespace

const TestAuthority& TestAuthority::shared() {
  static const TestAuthority authority;
  return authority;
}

TestAuthority::TestAuthority()
    : _authority{_folder.path("authority.pem"), _folder.path("authority.key")} {
  runToEnd(openssl, {"req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:P-256",
                     "-nodes", "-keyout", _authority.keyFile, "-out", _authority.certificateFile,
                     "-subj", "/CN=Authority of the tests", "-days", "2"});
  _server = _issue("server", "DNS:localhost,IP:127.0.0.1", 2);
  _expired = _issue("expired", "DNS:localhost,IP:127.0.0.1", -1);
  _foreign = _issue("foreign", "DNS:elsewhere.invalid", 2);
}

TestAuthority::Identity TestAuthority::_issue(const std::string& name,
                                              const std::string& alternativeNames, int days) const {
  Identity identity{_folder.path(name + ".pem"), _folder.path(name + ".key")};
  const std::string request = _folder.path(name + ".csr");
  runToEnd(openssl, {"req", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:P-256", "-nodes",
                     "-keyout", identity.keyFile, "-out", request, "-subj", "/CN=" + name});
  const std::string extensions =
      _folder.write(name + ".ext", "subjectAltName=" + alternativeNames + "\n");
  runToEnd(openssl, {"x509", "-req", "-in", request, "-CA", _authority.certificateFile, "-CAkey",
                     _authority.keyFile, "-CAcreateserial", "-days", std::to_string(days),
                     "-extfile", extensions, "-out", identity.certificateFile});
  return identity;
}

}  // namespace tests
