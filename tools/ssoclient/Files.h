#pragma once

#include <string>

/**
 * Reads a whole file; `-` is standard input.
 *
 * @throws UsageError  it cannot be read, or is larger than any file this program has a use for.
 */
std::string ReadFile(const std::string& path);

/**
 * A file that appears under its name whole or not at all, readable by its owner only. Whether its
 * folder lets files be made is looked up when the object is made, so that this is known before a
 * token is asked for. Nothing is made before there is something to write: whatever ends the
 * program until then leaves no trace.
 */
class OutputFile
{
public:
    /** @throws UsageError  no file can be made there, or what is there is no regular file. */
    explicit OutputFile(std::string path);

    /**
     * Writes a file with `text` in place of one that was there; nothing but a regular file is
     * ever replaced.
     *
     * @throws UsageError  that fails.
     */
    void Write(const std::string& text) const;

private:
    std::string _path;
};
