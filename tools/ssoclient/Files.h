#pragma once

#include "FileDescriptor.h"

#include <string>

/**
 * Reads a whole file; `-` is standard input.
 *
 * @throws UsageError  it cannot be read, or is larger than any file this program has a use for.
 */
std::string ReadFile(const std::string& path);

/**
 * A file that appears under its name whole or not at all, readable by its owner only. It is
 * prepared when the object is made, so that a path that cannot be written is known before a token
 * is asked for; what is not committed leaves no trace.
 */
class OutputFile
{
public:
    /** @throws UsageError  no file can be made there. */
    explicit OutputFile(std::string path);
    OutputFile(const OutputFile&) = delete;
    OutputFile& operator=(const OutputFile&) = delete;
    ~OutputFile();

    /** Writes `text` and gives the file its name, in place of one that was there. */
    void Commit(const std::string& text);

private:
    std::string _path;
    std::string _temporaryPath;
    FileDescriptor _descriptor;
    bool _committed = false;
};
