#include "Files.h"

#include "ExitCode.h"
#include "FileDescriptor.h"
#include "fileWriting.h"

#include "quillon/MessageFormatter.h"

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

/** A file beside the one that it is to become; it goes if it does not become that. */
class TemporaryFile
{
public:
    // mkostemp makes the file with mode 0600, whatever the umask.
    explicit TemporaryFile(const std::string& path)
        : _name(GetFolder(path) + "ssoclient.XXXXXX")
        , _descriptor(::mkostemp(_name.data(), O_CLOEXEC))
    {
        if (!_descriptor.IsOpen()) {
            ThrowWriteError(path);
        }
    }
    TemporaryFile(const TemporaryFile&) = delete;
    TemporaryFile& operator=(const TemporaryFile&) = delete;
    ~TemporaryFile() { ::unlink(_name.c_str()); } // nothing has the name after a renaming

    const std::string& GetName() const noexcept { return _name; }
    int GetDescriptor() const noexcept { return _descriptor.Get(); }

private:
    std::string _name;
    FileDescriptor _descriptor;
};

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
{
    RequireRegularOrAbsent(_path);
    RequireWritableFolder(_path);
}

void OutputFile::Write(const std::string& text) const
{
    RequireRegularOrAbsent(_path); // it may be another one than when the token was asked for
    const FileSizeSignalGuard guard;
    const TemporaryFile file(_path);
    WriteAll(file.GetDescriptor(), text, _path);
    if (::fsync(file.GetDescriptor()) != 0
        || std::rename(file.GetName().c_str(), _path.c_str()) != 0) {
        ThrowWriteError(_path);
    }
}
