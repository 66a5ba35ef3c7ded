#pragma once

#include <array>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <memory>
#include <stdexcept>
#include <string>
#include <system_error>
#include <vector>

#include <spawn.h>
#include <sys/socket.h>
#include <sys/wait.h>
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
        : _script(StartScript())
        , _folder(ReadLine(*_script))
    {
        setenv("KRB5_CONFIG", (_folder / "krb5.conf").c_str(), 1);
        unsetenv("KRB5CCNAME");
        unsetenv("KRB5_KTNAME");
        unsetenv("KRB5_CLIENT_KTNAME");
    }

    /** Returns when the KDC and its folder are gone. */
    ~TestKdc()
    {
        shutdown(fileno(_script.get()), SHUT_WR);
        while (std::fgetc(_script.get()) != EOF) {
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
    struct Closer
    {
        void operator()(std::FILE* file) const { std::fclose(file); }
    };
    using File = std::unique_ptr<std::FILE, Closer>;

    static File Open(int descriptor)
    {
        File file(fdopen(descriptor, "r"));
        if (file == nullptr) {
            throw std::system_error(errno, std::generic_category(), "fdopen");
        }
        return file;
    }

    /**
     * Starts the script and returns the other end of its standard input and output. No other
     * process gets that end, so that it closes with this process, however it ends.
     */
    static File StartScript()
    {
        std::array<int, 2> ends{};
        if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends.data()) != 0) {
            throw std::system_error(errno, std::generic_category(), "socketpair");
        }
        File ours = Open(ends[0]);
        const File theirs = Open(ends[1]);
        Spawn({"setsid", "--fork", TEST_SUPPORT_DIR "/kdc.sh"}, ends[1]);
        return ours;
    }

    /** Runs a command whose standard input and output are `descriptor`. */
    static void Spawn(std::vector<std::string> command, int descriptor)
    {
        std::vector<char*> arguments;
        for (std::string& part : command) {
            arguments.push_back(part.data());
        }
        arguments.push_back(nullptr);
        posix_spawn_file_actions_t actions;
        posix_spawn_file_actions_init(&actions);
        posix_spawn_file_actions_adddup2(&actions, descriptor, STDIN_FILENO);
        posix_spawn_file_actions_adddup2(&actions, descriptor, STDOUT_FILENO);
        pid_t pid = 0;
        const int error =
            posix_spawnp(&pid, arguments[0], &actions, nullptr, arguments.data(), environ);
        posix_spawn_file_actions_destroy(&actions);
        if (error != 0) {
            throw std::system_error(error, std::generic_category(), command[0]);
        }
        waitpid(pid, nullptr, 0);
    }

    static std::string ReadLine(std::FILE& file)
    {
        std::string line;
        for (int next = std::fgetc(&file); next != '\n'; next = std::fgetc(&file)) {
            if (next == EOF) {
                throw std::runtime_error("the KDC did not start");
            }
            line += static_cast<char>(next);
        }
        return line;
    }

    static void RunCommand(const std::string& command)
    {
        if (std::system(command.c_str()) != 0) {
            throw std::runtime_error("failed: " + command);
        }
    }

    const File _script;
    const std::filesystem::path _folder;
};

} // namespace Testing
