#pragma once

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string>

#include <unistd.h>

namespace Testing {

/**
 * A Kerberos realm, EXAMPLE.TEST, with a KDC of its own for as long as the object lives; see
 * support/kdc.sh for what is in its folder. It points KRB5_CONFIG of this process to it, and must
 * therefore be made before there are threads that use Kerberos.
 */
class TestKdc
{
public:
    TestKdc()
        : _folder(MakeFolder())
    {
        setenv("KRB5_CONFIG", (_folder / "krb5.conf").c_str(), 1);
        unsetenv("KRB5CCNAME");
        unsetenv("KRB5_KTNAME");
        unsetenv("KRB5_CLIENT_KTNAME");
        Run("start");
    }

    ~TestKdc()
    {
        try {
            Run("stop");
            std::filesystem::remove_all(_folder);
        } catch (const std::exception&) {
            // A folder that stays behind fails no test.
        }
    }

    TestKdc(const TestKdc&) = delete;
    TestKdc& operator=(const TestKdc&) = delete;

    const std::filesystem::path& GetFolder() const { return _folder; }

    std::string GetFile(const std::string& name) const { return (_folder / name).string(); }

    std::string Read(const std::string& name) const
    {
        std::ifstream file(_folder / name, std::ios::binary);
        return {std::istreambuf_iterator<char>(file), {}};
    }

    /** Gets a ticket-granting ticket of `principal` with `<principal>.keytab` into `ccache`. */
    void LogOn(const std::string& principal, const std::string& ccache) const
    {
        const std::string keytab = GetFile(principal + ".keytab");
        RunCommand("kinit -k -t '" + keytab + "' -c 'FILE:" + ccache + "' '" + principal + "'");
    }

private:
    static std::filesystem::path MakeFolder()
    {
        std::string path = (std::filesystem::temp_directory_path() / "test-kdc-XXXXXX").string();
        if (mkdtemp(path.data()) == nullptr) {
            throw std::runtime_error("cannot make " + path);
        }
        return path;
    }

    static void RunCommand(const std::string& command)
    {
        if (std::system(command.c_str()) != 0) {
            throw std::runtime_error("failed: " + command);
        }
    }

    void Run(const std::string& action) const
    {
        RunCommand("'" TEST_SUPPORT_DIR "/kdc.sh' " + action + " '" + _folder.string() + "'");
    }

    std::filesystem::path _folder;
};

} // namespace Testing
