#pragma once

#include <cerrno>
#include <utility>

#include <unistd.h>

/** Owns a file descriptor, or none. */
class FileDescriptor
{
public:
    FileDescriptor() noexcept = default;
    explicit FileDescriptor(int descriptor) noexcept
        : _descriptor(descriptor)
    {}
    FileDescriptor(FileDescriptor&& other) noexcept
        : _descriptor(std::exchange(other._descriptor, -1))
    {}
    FileDescriptor& operator=(FileDescriptor&& other) noexcept
    {
        std::swap(_descriptor, other._descriptor);
        return *this;
    }
    ~FileDescriptor()
    {
        if (IsOpen()) {
            ::close(_descriptor);
        }
    }

    bool IsOpen() const noexcept { return _descriptor >= 0; }
    int Get() const noexcept { return _descriptor; }

private:
    int _descriptor = -1;
};

/** Repeats a system call for as long as signals interrupt it. */
template <class Call>
auto RetryInterrupted(Call call)
{
    auto result = call();
    while (result < 0 && errno == EINTR) {
        result = call();
    }
    return result;
}
