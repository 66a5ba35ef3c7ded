#include "Files.h"

#include "ExitCode.h"

#include "quillon/MessageFormatter.h"

#include <sys/stat.h>

#include <cstdio>
#include <cstdlib>

#include <fcntl.h>
#include <unistd.h>

using Quillon::MessageFormatter;

namespace {

// Far more than the library reads of a token, so that an oversized one is refused there; this only
// bounds what an endless input can take up.
constexpr std::size_t MaxFileBytes = std::size_t{64} * 1024 * 1024;

// Larger than a key file, which therefore is read in one piece and leaves no copies behind.
constexpr std::size_t FirstReadBytes = std::size_t{16} * 1024;

std::string ReadAll(int descriptor, const std::string& name)
{
    std::string text(FirstReadBytes, '\0');
    for (std::size_t used = 0;;) {
        if (used == text.size()) {
            text.resize(2 * used);
        }
        const ssize_t count = RetryInterrupted(
            [&] { return ::read(descriptor, text.data() + used, text.size() - used); });
        if (count < 0) {
            ThrowSystemError("cannot read " + name);
        }
        if (count == 0) {
            text.resize(used);
            return text;
        }
        used += static_cast<std::size_t>(count);
        if (used > MaxFileBytes) {
            throw UsageError(
                MessageFormatter::ASPrint("%1 is larger than %2 bytes", name, MaxFileBytes));
        }
    }
}

/** Renaming over a device or a pipe would replace it instead of writing to it. */
void RequireRegularOrAbsent(const std::string& path)
{
    struct stat status = {};
    if (::stat(path.c_str(), &status) == 0 && !S_ISREG(status.st_mode)) {
        throw UsageError(MessageFormatter::ASPrint("`%1' is not a regular file", path));
    }
}

void WriteAll(int descriptor, const std::string& text, const std::string& path)
{
    for (std::size_t at = 0; at < text.size();) {
        const ssize_t count = RetryInterrupted(
            [&] { return ::write(descriptor, text.data() + at, text.size() - at); });
        if (count < 0) {
            ThrowSystemError("cannot write `" + path + "'");
        }
        at += static_cast<std::size_t>(count);
    }
}

} // namespace

std::string ReadFile(const std::string& path)
{
    if (path == "-") {
        return ReadAll(STDIN_FILENO, "standard input");
    }
    const FileDescriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    if (!file.IsOpen()) {
        ThrowSystemError("cannot open `" + path + "'");
    }
    return ReadAll(file.Get(), "`" + path + "'");
}

OutputFile::OutputFile(std::string path)
    : _path(std::move(path))
    , _temporaryPath(_path + ".XXXXXX")
{
    RequireRegularOrAbsent(_path);
    // mkostemp makes the file with mode 0600, whatever the umask.
    _descriptor = FileDescriptor(::mkostemp(_temporaryPath.data(), O_CLOEXEC));
    if (!_descriptor.IsOpen()) {
        ThrowSystemError("cannot write `" + _path + "'");
    }
}

OutputFile::~OutputFile()
{
    if (!_committed) {
        ::unlink(_temporaryPath.c_str());
    }
}

void OutputFile::Commit(const std::string& text)
{
    WriteAll(_descriptor.Get(), text, _path);
    if (::fsync(_descriptor.Get()) != 0
        || std::rename(_temporaryPath.c_str(), _path.c_str()) != 0) {
        ThrowSystemError("cannot write `" + _path + "'");
    }
    _committed = true;
}
