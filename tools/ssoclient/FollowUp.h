#pragma once

#include <csignal>
#include <optional>
#include <string>
#include <vector>

#include <sys/types.h>

/**
 * The command that is run after each new token, through `/bin/sh -c`. There is one at a time: what
 * becomes due while it runs is run once when it has ended.
 */
class FollowUp
{
public:
    /**
     * @param command  empty for none.
     * @param file     of the token; the command finds it in `SSOCLIENT_TOKEN_FILE`, with its path.
     * @param signals  that are blocked for the command.
     */
    FollowUp(std::string command, const std::string& file, const sigset_t& signals);

    /** Runs the command. @return what went wrong, if anything did. */
    std::optional<std::string> Run();

    /**
     * To be called when a child has ended. Takes note of all that have: as the first process of a
     * container, this one is given children of others.
     *
     * @return what went wrong, if anything did.
     */
    std::optional<std::string> OnChildEnded();

private:
    std::optional<std::string> Start();

    std::string _command;
    std::vector<std::string> _environment;
    sigset_t _signals;
    pid_t _running = -1;
    bool _isDue = false; // again
};
