#include "FollowUp.h"

#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <system_error>
#include <utility>

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

constexpr char FileVariable[] = "SSOCLIENT_TOKEN_FILE=";

/** That of this process, and the path of the file, whatever folder the command changes to. */
std::vector<std::string> MakeEnvironment(const std::string& file)
{
    std::vector<std::string> variables;
    for (char** variable = environ; *variable != nullptr; ++variable) {
        if (std::strncmp(*variable, FileVariable, sizeof FileVariable - 1) != 0) {
            variables.emplace_back(*variable);
        }
    }
    variables.push_back(FileVariable + std::filesystem::absolute(file).string());
    return variables;
}

std::vector<char*> ToPointers(std::vector<std::string>& texts)
{
    std::vector<char*> pointers;
    pointers.reserve(texts.size() + 1);
    for (std::string& text : texts) {
        pointers.push_back(text.data());
    }
    pointers.push_back(nullptr);
    return pointers;
}

/** How a process is started: with the signals that are this one's to read, and with no input. */
class SpawnSettings
{
public:
    explicit SpawnSettings(const sigset_t& signals)
    {
        ::posix_spawnattr_init(&attributes);
        ::posix_spawnattr_setsigmask(&attributes, &signals);
        ::posix_spawnattr_setflags(&attributes, POSIX_SPAWN_SETSIGMASK);
        ::posix_spawn_file_actions_init(&actions);
        ::posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    }
    SpawnSettings(const SpawnSettings&) = delete;
    SpawnSettings& operator=(const SpawnSettings&) = delete;
    ~SpawnSettings()
    {
        ::posix_spawn_file_actions_destroy(&actions);
        ::posix_spawnattr_destroy(&attributes);
    }

    posix_spawnattr_t attributes = {};
    posix_spawn_file_actions_t actions = {};
};

std::optional<std::string> DescribeEnd(int status)
{
    if (WIFSIGNALED(status)) {
        return "the command of --exec was ended by signal " + std::to_string(WTERMSIG(status));
    }
    if (WEXITSTATUS(status) != 0) {
        return "the command of --exec failed with exit code " + std::to_string(WEXITSTATUS(status));
    }
    return std::nullopt;
}

} // namespace

FollowUp::FollowUp(std::string command, const std::string& file, const sigset_t& signals)
    : _command(std::move(command))
    , _environment(MakeEnvironment(file))
    , _signals(signals)
{}

std::optional<std::string> FollowUp::Run()
{
    if (_command.empty()) {
        return std::nullopt;
    }
    if (_running < 0) {
        return Start();
    }
    _isDue = true;
    return "the command of --exec still runs, and is run again when it has ended";
}

std::optional<std::string> FollowUp::Start()
{
    std::vector<std::string> words = {"sh", "-c", _command};
    const SpawnSettings settings(_signals);
    const int error = ::posix_spawn(
        &_running,
        "/bin/sh",
        &settings.actions,
        &settings.attributes,
        ToPointers(words).data(),
        ToPointers(_environment).data());
    if (error == 0) {
        return std::nullopt;
    }
    _running = -1;
    return "the command of --exec cannot be run: " + std::system_category().message(error);
}

std::optional<std::string> FollowUp::OnChildEnded()
{
    std::optional<std::string> problem;
    int status = 0;
    for (pid_t ended = 0; (ended = ::waitpid(-1, &status, WNOHANG)) > 0;) {
        if (ended == _running) {
            _running = -1;
            problem = DescribeEnd(status);
        }
    }
    if (_running < 0 && std::exchange(_isDue, false)) {
        const std::optional<std::string> another = Start();
        problem = problem ? problem : another;
    }
    return problem;
}
