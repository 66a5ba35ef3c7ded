#pragma once

#include <csignal>
#include <string>

// What the ways to write a file have in common.

/** Says that `path` cannot be written, and the reason that `errno` tells. */
[[noreturn]] void ThrowWriteError(const std::string& path);

/**
 * Renaming over a device or a pipe would replace it instead of writing to it. A link is refused
 * rather than followed: somebody else may have laid it where the file was expected.
 *
 * @throws UsageError  what is there is neither a regular file nor nothing.
 */
void RequireRegularOrAbsent(const std::string& path);

/** The folder of `path`, to put the name of a file behind. */
std::string GetFolder(const std::string& path);

/** @throws UsageError  no file can be made beside `path`. */
void RequireWritableFolder(const std::string& path);

/** @throws UsageError  which names `path`. */
void WriteAll(int descriptor, const std::string& text, const std::string& path);

/**
 * For as long as it lives, a file beyond the limit of the process is an error of `write`, not a
 * signal that would leave the temporary file behind.
 */
class FileSizeSignalGuard
{
public:
    FileSizeSignalGuard()
        : _before(std::signal(SIGXFSZ, SIG_IGN))
    {}
    FileSizeSignalGuard(const FileSizeSignalGuard&) = delete;
    FileSizeSignalGuard& operator=(const FileSizeSignalGuard&) = delete;
    ~FileSizeSignalGuard() { std::signal(SIGXFSZ, _before); }

private:
    void (*_before)(int);
};
