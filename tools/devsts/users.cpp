// SPDX-License-Identifier: Apache-2.0

#include "users.h"

#include <nlohmann/json.hpp>
#include <openssl/evp.h>

#include <array>
#include <fstream>
#include <stdexcept>

namespace DevSts {

namespace {

using Json = nlohmann::json;
using Digest = std::array<unsigned char, EVP_MAX_MD_SIZE>;

constexpr const char *KNOWN_USERS = R"([
  {"name": "alice@corp.example", "password": "wonderland", "first": "Alice", "last": "Liddell",
   "groups": ["admins@corp.example", "users@corp.example"]},
  {"name": "bob@corp.example", "password": "builder", "first": "Bob", "last": "Baumeister",
   "groups": ["users@corp.example"]}
])";

/// Requires a name, "@" and a domain, without characters that XML cannot represent.
void RequirePrincipal(const std::string &text) {
  const std::size_t at = text.rfind('@');
  bool isPrintable = true;
  for (const char c : text) {
    isPrintable = isPrintable && static_cast<unsigned char>(c) >= 0x20;
  }
  if (at == std::string::npos || at == 0 || at + 1 == text.size() || !isPrintable) {
    throw std::runtime_error("'" + text + "' is not of the form name@domain");
  }
}

User ReadUser(const Json &json) {
  User user{json.at("name"), json.at("password"), json.value("first", ""), json.value("last", ""),
            json.value("groups", std::vector<std::string>())};
  RequirePrincipal(user.name);
  for (const std::string &group : user.groups) {
    RequirePrincipal(group);
  }
  return user;
}

std::map<std::string, User> ReadUsers(const Json &json) {
  if (!json.is_array()) {
    throw std::runtime_error("not an array of users");
  }
  std::map<std::string, User> users;
  for (const Json &entry : json) {
    User user = ReadUser(entry);
    const std::string name = user.name;
    if (!users.emplace(name, std::move(user)).second) {
      throw std::runtime_error("'" + name + "' occurs twice");
    }
  }
  return users;
}

Digest DigestOf(std::string_view text) {
  Digest digest{};
  EVP_Digest(text.data(), text.size(), digest.data(), nullptr, EVP_sha256(), nullptr);
  return digest;
}

} // namespace

Users::Users() : m_users(ReadUsers(Json::parse(KNOWN_USERS))) {}

Users::Users(const std::filesystem::path &file) {
  std::ifstream stream(file);
  if (!stream) {
    throw std::runtime_error(file.string() + ": cannot be read");
  }
  try {
    m_users = ReadUsers(Json::parse(stream));
  } catch (const Json::parse_error &failure) {
    // The parser's own message quotes what was read last, which may be a password.
    throw std::runtime_error(file.string() + ": not JSON at byte " + std::to_string(failure.byte));
  } catch (const std::exception &failure) {
    throw std::runtime_error(file.string() + ": " + failure.what());
  }
}

const User *Users::Find(const std::string &name) const {
  const auto found = m_users.find(name);
  return found == m_users.end() ? nullptr : &found->second;
}

const User *Users::Authenticate(const std::string &name, std::string_view password) const {
  const User *const user = Find(name);
  // Digests have a fixed length, so that the time of the comparison does not reveal the length of the password.
  const Digest expected = DigestOf(user ? std::string_view(user->password) : std::string_view());
  const Digest given = DigestOf(password);
  const bool isRight = CRYPTO_memcmp(expected.data(), given.data(), expected.size()) == 0;
  return user && isRight ? user : nullptr;
}

} // namespace DevSts
