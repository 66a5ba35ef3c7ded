#include "fileWriting.h"

#include "ExitCode.h"
#include "FileDescriptor.h"

#include "quillon/MessageFormatter.h"

#include <sys/stat.h>

#include <cerrno>

#include <unistd.h>

using Quillon::MessageFormatter;

void ThrowWriteError(const std::string& path)
{
    ThrowSystemError("cannot write `" + path + "'");
}

void RequireRegularOrAbsent(const std::string& path)
{
    struct stat status = {};
    if (::lstat(path.c_str(), &status) != 0) {
        if (errno != ENOENT) {
            ThrowWriteError(path);
        }
    } else if (S_ISLNK(status.st_mode)) {
        throw UsageError(MessageFormatter::ASPrint("`%1' is a link: name the file itself", path));
    } else if (!S_ISREG(status.st_mode)) {
        throw UsageError(MessageFormatter::ASPrint("`%1' is not a regular file", path));
    }
}

std::string GetFolder(const std::string& path)
{
    const std::size_t slash = path.rfind('/');
    return slash == std::string::npos ? "./" : path.substr(0, slash + 1);
}

void RequireWritableFolder(const std::string& path)
{
    if (::access(GetFolder(path).c_str(), W_OK | X_OK) != 0) {
        ThrowWriteError(path);
    }
}

void WriteAll(int descriptor, const std::string& text, const std::string& path)
{
    for (std::size_t at = 0; at < text.size();) {
        const ssize_t count = RetryInterrupted(
            [&] { return ::write(descriptor, text.data() + at, text.size() - at); });
        if (count < 0) {
            ThrowWriteError(path);
        }
        at += static_cast<std::size_t>(count);
    }
}
