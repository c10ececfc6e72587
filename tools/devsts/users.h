// SPDX-License-Identifier: Apache-2.0
/// @file
/// The users that the service knows.

#pragma once

#include <filesystem>
#include <map>
#include <string>
#include <string_view>
#include <vector>

namespace DevSts {

struct User {
  std::string name; ///< such as "alice@corp.example"
  std::string password;
  std::string first;
  std::string last;
  std::vector<std::string> groups; ///< such as "admins@corp.example"
};

class Users {
public:
  /// alice@corp.example and bob@corp.example.
  Users();
  /// The users of a JSON file. @throws std::runtime_error naming the file when it cannot be read or has another form
  explicit Users(const std::filesystem::path &file);

  /// Null for an unknown user.
  const User *Find(const std::string &name) const;

  /// Null unless the user is known and the password is right. An unknown user takes as long as a wrong password.
  const User *Authenticate(const std::string &name, std::string_view password) const;

private:
  std::map<std::string, User> m_users;
};

} // namespace DevSts
