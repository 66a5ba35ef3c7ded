#pragma once

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace DevSts {

struct User
{
    std::string name; ///< "name@domain"
    std::optional<std::string> password;
    std::string givenName;
    std::string surname;
    std::vector<std::string> groups; ///< "DOMAIN\name" each
    bool isSolution = false;
    std::optional<std::string> certificateDer;
};

/** The people and services that this STS knows. */
class Users
{
public:
    /**
     * Reads users.json of the state directory.
     *
     * @throws std::runtime_error  the file is missing or malformed; the text names the field.
     */
    static Users Load(const std::filesystem::path& stateDir);

    /** Letter case does not matter. Null if unknown. */
    const User* FindByName(const std::string& name) const;
    const User* FindByCertificate(const std::string& der) const;

    const std::vector<User>& All() const { return _users; }

private:
    std::vector<User> _users;
};

/** What users.json holds at first. */
std::string SampleUsersFile();

} // namespace DevSts
