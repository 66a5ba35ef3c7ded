#pragma once

#include "support/TestData.h"

#include <array>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>
#include <vector>

#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

namespace Testing {

/**
 * The development STS in a process of its own, for tests that disturb theirs. Its state directory
 * has the keys of the test data.
 */
class DevStsProcess
{
public:
    /**
     * @param program  the file of ssoclient-devsts.
     * @param options  of its command line, but for the state directory and the address.
     */
    explicit DevStsProcess(const std::string& program, std::vector<std::string> options = {})
        : _folder(MakeFolder())
    {
        options.insert(options.begin(), {program, "--state", _folder.string()});
        std::array<int, 2> ends{};
        if (pipe(ends.data()) != 0) {
            throw std::runtime_error("no pipe");
        }
        _pid = fork();
        if (_pid == 0) {
            Become(options, ends[1]);
        }
        close(ends[1]);
        _url = ReadUrl(ends[0]);
    }
    DevStsProcess(const DevStsProcess&) = delete;
    DevStsProcess& operator=(const DevStsProcess&) = delete;
    ~DevStsProcess()
    {
        kill(_pid, SIGKILL);
        waitpid(_pid, nullptr, 0);
        std::error_code ignored;
        std::filesystem::remove_all(_folder, ignored);
    }

    const std::string& GetUrl() const { return _url; }
    const std::filesystem::path& GetFolder() const { return _folder; }

    std::string Read(const std::string& name) const
    {
        std::ifstream file(_folder / name, std::ios::binary);
        return {std::istreambuf_iterator<char>(file), {}};
    }
    void Write(const std::string& name, const std::string& text) const
    {
        std::ofstream(_folder / name, std::ios::binary | std::ios::trunc) << text;
    }

private:
    std::filesystem::path MakeFolder() const
    {
        std::string pattern = (std::filesystem::temp_directory_path() / "devsts-XXXXXX").string();
        if (mkdtemp(pattern.data()) == nullptr) {
            throw std::runtime_error("mkdtemp failed");
        }
        const std::filesystem::path folder = pattern;
        for (const std::string name : {"sts", "client"}) {
            std::ofstream(folder / (name + ".key")) << ReadTestData("keys/" + name + "-key.pem");
            std::ofstream(folder / (name + ".pem")) << ReadTestData("keys/" + name + "-cert.pem");
        }
        return folder;
    }

    /** It ends with the thread that has started it, however that ends. */
    [[noreturn]] static void Become(const std::vector<std::string>& command, int output)
    {
        prctl(PR_SET_PDEATHSIG, SIGKILL);
        dup2(output, STDOUT_FILENO);
        std::freopen("/dev/null", "w", stderr);
        std::vector<char*> arguments;
        for (const std::string& word : command) {
            arguments.push_back(const_cast<char*>(word.c_str()));
        }
        arguments.push_back(nullptr);
        execv(arguments[0], arguments.data());
        _exit(127);
    }

    static std::string ReadUrl(int descriptor)
    {
        std::FILE* const output = fdopen(descriptor, "r");
        std::array<char, 200> line{};
        const bool isThere = std::fgets(line.data(), line.size(), output) != nullptr;
        std::fclose(output);
        const std::string text = line.data();
        const std::string before = "listening on ";
        if (!isThere || text.rfind(before, 0) != 0) {
            throw std::runtime_error("the token service did not start: " + text);
        }
        return text.substr(before.size(), text.find_last_not_of('\n') + 1 - before.size());
    }

    std::filesystem::path _folder;
    pid_t _pid = 0;
    std::string _url;
};

} // namespace Testing
