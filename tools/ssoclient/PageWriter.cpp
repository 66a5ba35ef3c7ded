#include "PageWriter.h"

#include "ExitCode.h"

#include <array>
#include <csignal>
#include <cstdint>
#include <string_view>

#include <fcntl.h>
#include <sys/wait.h>

namespace {

struct Pipe
{
    FileDescriptor out;
    FileDescriptor in;
};

Pipe MakePipe()
{
    std::array<int, 2> ends{};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0) {
        ThrowSystemError("cannot start what writes the page");
    }
    return {FileDescriptor(ends[0]), FileDescriptor(ends[1])};
}

/** @return whether all of it was taken. */
bool Send(const FileDescriptor& to, std::string_view bytes)
{
    while (!bytes.empty()) {
        const ssize_t count =
            RetryInterrupted([&] { return ::write(to.Get(), bytes.data(), bytes.size()); });
        if (count <= 0) {
            return false;
        }
        bytes.remove_prefix(static_cast<std::size_t>(count));
    }
    return true;
}

/** @return whether all of it came. */
bool Receive(const FileDescriptor& from, char* bytes, std::size_t size)
{
    while (size > 0) {
        const ssize_t count = RetryInterrupted([&] { return ::read(from.Get(), bytes, size); });
        if (count <= 0) {
            return false;
        }
        bytes += count;
        size -= static_cast<std::size_t>(count);
    }
    return true;
}

/** With its length before it, so that a text that was cut off is none. */
bool SendText(const FileDescriptor& to, const std::string& text)
{
    const std::uint64_t size = text.size();
    return Send(to, {reinterpret_cast<const char*>(&size), sizeof size}) && Send(to, text);
}

bool ReceiveText(const FileDescriptor& from, std::string& text)
{
    std::uint64_t size = 0;
    if (!Receive(from, reinterpret_cast<char*>(&size), sizeof size)) {
        return false;
    }
    text.resize(size);
    return Receive(from, text.data(), text.size());
}

/** Why `text` could not be written; empty if it was. */
std::string TryToWrite(const OutputFile& file, const std::string& text)
{
    try {
        file.Write(text);
        return "";
    } catch (const UsageError& error) {
        return error.what();
    }
}

[[noreturn]] void Serve(const OutputFile& file, const FileDescriptor& in, const FileDescriptor& out)
{
    std::string text;
    if (ReceiveText(in, text)) {
        SendText(out, TryToWrite(file, text));
    }
    ::_exit(0);
}

} // namespace

PageWriter::PageWriter(const std::string& path)
{
    const OutputFile file(path);
    Pipe there = MakePipe();
    Pipe back = MakePipe();
    _pid = ::fork();
    if (_pid < 0) {
        ThrowSystemError("cannot start what writes the page");
    }
    if (_pid == 0) {
        there.in = FileDescriptor(); // its end is the other process's end
        Serve(file, there.out, back.in);
    }
    _toWriter = std::move(there.in);
    _fromWriter = std::move(back.out);
}

PageWriter::~PageWriter()
{
    _toWriter = FileDescriptor();
    RetryInterrupted([this] { return ::waitpid(_pid, nullptr, 0); });
}

void PageWriter::Write(const std::string& text)
{
    const auto before = std::signal(SIGPIPE, SIG_IGN);
    std::string failure;
    const bool isAnswered = SendText(_toWriter, text) && ReceiveText(_fromWriter, failure);
    std::signal(SIGPIPE, before);
    if (!isAnswered) {
        throw UsageError("what writes the page has ended");
    }
    if (!failure.empty()) {
        throw UsageError(failure);
    }
}
