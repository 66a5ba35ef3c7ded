#include "devsts/state/Users.h"

#include "devsts/security/Certificates.h"
#include "devsts/state/State.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <set>
#include <stdexcept>
#include <strings.h>

namespace DevSts {

namespace {

using Json = nlohmann::ordered_json;

constexpr const char* SampleUsers = R"json({
  "about": [
    "The users of the development STS. Edit freely: the file is read for every request.",
    "name         name@domain, as the user logs on and as it stands in tokens (required)",
    "password     logs on with this password; without it, not by password at all",
    "givenName    goes into tokens",
    "surname      goes into tokens",
    "groups       list of DOMAIN\\group",
    "solution     true for a service (a solution user)",
    "certificate  PEM file in this directory; its key may sign requests in this user's name"
  ],
  "users": [
    {
      "name": "alice@example.test",
      "password": "alice-secret",
      "givenName": "Alice",
      "surname": "Archer",
      "groups": ["EXAMPLE\\Administrators", "EXAMPLE\\Users"]
    },
    {
      "name": "bob@example.test",
      "password": "bob-secret",
      "givenName": "Bob",
      "surname": "Baker",
      "groups": ["EXAMPLE\\Users"]
    },
    {
      "name": "service@example.test",
      "password": "service-secret",
      "groups": ["EXAMPLE\\SolutionUsers"],
      "solution": true,
      "certificate": "client.pem"
    }
  ]
}
)json";

void RefuseUnknownFields(const Json& entry)
{
    static const std::set<std::string> known = {
        "name", "password", "givenName", "surname", "groups", "solution", "certificate"};
    for (const auto& [key, value] : entry.items()) {
        if (known.count(key) == 0) {
            throw std::runtime_error("unknown field '" + key + "'");
        }
    }
}

void RequirePrincipal(const std::string& name)
{
    const std::size_t at = name.rfind('@');
    if (at == std::string::npos || at == 0 || at + 1 == name.size()) {
        throw std::runtime_error("name '" + name + "' is not of the form name@domain");
    }
}

void RequireGroup(const std::string& group)
{
    const std::size_t slash = group.find('\\');
    if (slash == std::string::npos || slash == 0 || slash + 1 == group.size()) {
        throw std::runtime_error("group '" + group + "' is not of the form DOMAIN\\group");
    }
}

User ReadUser(const Json& entry, const std::filesystem::path& stateDir)
{
    RefuseUnknownFields(entry);
    User user;
    user.name = entry.at("name").get<std::string>();
    RequirePrincipal(user.name);
    if (entry.contains("password")) {
        user.password = entry.at("password").get<std::string>();
    }
    user.givenName = entry.value("givenName", "");
    user.surname = entry.value("surname", "");
    user.groups = entry.value("groups", std::vector<std::string>());
    std::for_each(user.groups.begin(), user.groups.end(), RequireGroup);
    user.isSolution = entry.value("solution", false);
    if (entry.contains("certificate")) {
        user.certificateDer =
            DerFromPem(ReadFile(stateDir / entry.at("certificate").get<std::string>()));
    }
    return user;
}

bool SameName(const std::string& left, const std::string& right)
{
    return left.size() == right.size() && strncasecmp(left.data(), right.data(), left.size()) == 0;
}

} // namespace

Users Users::Load(const std::filesystem::path& stateDir)
{
    Users users;
    try {
        const Json root = Json::parse(ReadFile(stateDir / "users.json"));
        for (const Json& entry : root.at("users")) {
            users._users.push_back(ReadUser(entry, stateDir));
        }
    } catch (const std::exception& error) {
        throw std::runtime_error(std::string("users.json: ") + error.what());
    }
    return users;
}

const User* Users::FindByName(const std::string& name) const
{
    const auto found = std::find_if(
        _users.begin(), _users.end(), [&](const User& user) { return SameName(user.name, name); });
    return found == _users.end() ? nullptr : &*found;
}

const User* Users::FindByCertificate(const std::string& der) const
{
    const auto found = std::find_if(
        _users.begin(), _users.end(), [&](const User& user) { return user.certificateDer == der; });
    return found == _users.end() ? nullptr : &*found;
}

std::string SampleUsersFile()
{
    return SampleUsers;
}

} // namespace DevSts
