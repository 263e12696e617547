// Certificates for tests of TLS, made by the openssl program.
#pragma once

#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>

#include "agentd/http/HttpOptions.h"

namespace Agentd::Testing {

// A folder of NAME.pem and NAME.key, gone with its object. Everything in it is valid for two days.
class Certificates {
 public:
  Certificates() { std::filesystem::create_directory(_folder); }
  ~Certificates() { std::filesystem::remove_all(_folder); }
  Certificates(const Certificates&) = delete;
  Certificates& operator=(const Certificates&) = delete;

  std::string Pem(const std::string& name) const { return _folder + "/" + name + ".pem"; }
  std::string Key(const std::string& name) const { return _folder + "/" + name + ".key"; }

  inline static const std::string newKey = "-newkey ec -pkeyopt ec_paramgen_curve:P-256 -nodes";
  inline static const std::string newRsaKey = "-newkey rsa:2048 -nodes";

  // One that others are issued by.
  void MakeCa(const std::string& name) const {
    Run("req -x509 " + newKey + " -days 2 -subj /CN=" + name + " -keyout " + Key(name) + " -out " +
        Pem(name));
  }
  // `subjectNames` as in "DNS:kova.example,IP:127.0.0.1".
  void Issue(const std::string& name, const std::string& ca, const std::string& subjectNames,
             const std::string& days = "2", const std::string& key = newKey) const {
    const std::string request = _folder + "/" + name + ".csr";
    std::ofstream(_folder + "/names") << "subjectAltName=" << subjectNames << "\n";
    Run("req " + key + " -subj /CN=" + name + " -keyout " + Key(name) + " -out " + request);
    Run("x509 -req -in " + request + " -CA " + Pem(ca) + " -CAkey " + Key(ca) + " -CAcreateserial -days " +
        days + " -extfile " + _folder + "/names -out " + Pem(name));
  }

  TlsFiles ServerFiles(const std::string& server, const std::string& clientCa) const {
    return {Pem(server), Key(server), Pem(clientCa)};
  }

 private:
  inline static std::atomic<int> count{0};

  static void Run(const std::string& command) {
    EXPECT_EQ(std::system(("openssl " + command + " >/dev/null 2>&1").c_str()), 0) << command;
  }

  const std::string _folder =
      testing::TempDir() + "kova-tls-" + std::to_string(getpid()) + "-" + std::to_string(++count);
};

}  // namespace Agentd::Testing
