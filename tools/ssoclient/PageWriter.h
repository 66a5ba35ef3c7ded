#pragma once

#include "FileDescriptor.h"
#include "Files.h"

#include <string>

#include <sys/types.h>

/**
 * Writes a file for a process that cannot open one any more, see `Confine`. It is a process of its
 * own, which takes a text from the other, and nothing that says where it goes.
 */
class PageWriter
{
public:
    /**
     * Starts that process; to be made before there are threads.
     *
     * @throws UsageError  no file can be made there, or there is no process to be had.
     */
    explicit PageWriter(const std::string& path);
    PageWriter(const PageWriter&) = delete;
    PageWriter& operator=(const PageWriter&) = delete;

    /** Ends that process, which leaves no file behind if nothing was written. */
    ~PageWriter();

    /** See `OutputFile::Write`. Called once. */
    void Write(const std::string& text);

private:
    FileDescriptor _toWriter;
    FileDescriptor _fromWriter;
    pid_t _pid = 0;
};
