#pragma once

#include <string>

#include <sys/types.h>

/**
 * A file that is replaced again and again, for others to read at any moment. Like an `OutputFile`,
 * it is there whole or not at all, and only in the place of a regular file. Beyond that, what was
 * written outlives a sudden end of the machine; and a process that is killed while it writes leaves
 * no more than one file behind, `.NAME.ssoclient`, which the next one takes away.
 */
class ReplacedFile
{
public:
    /**
     * @param mode  of the file, less the umask.
     * @throws UsageError  no file can be made there, what is there is no regular file, or another
     *                     process is writing it.
     */
    ReplacedFile(std::string path, mode_t mode);

    const std::string& GetPath() const noexcept { return _path; }

    /** @throws UsageError  that fails; what was there before still is. */
    void Write(const std::string& text) const;

private:
    std::string _path;
    mode_t _mode;
};
