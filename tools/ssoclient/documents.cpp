// Writes the manual pages and the completions of ssoclient, when it is built, below the folder that
// the argument names, where they stand below `share` when they are installed.

#include "Program.h"
#include "completions.h"
#include "manPages.h"

#include <filesystem>
#include <fstream>
#include <iostream>

namespace {

void Write(const std::filesystem::path& path, const std::string& text)
{
    std::filesystem::create_directories(path.parent_path());
    std::ofstream file(path, std::ios::binary);
    file << text << std::flush;
    if (!file) {
        throw std::runtime_error("cannot write " + path.string());
    }
}

void WriteAll(const std::filesystem::path& share)
{
    Invocation invocation;
    const CommandDescription program = MakeCommandLine(invocation)->Describe();
    for (const auto& [name, text] : WriteManPages(program, SSOCLIENT_VERSION)) {
        Write(share / "man" / "man1" / name, text);
    }
    Write(share / "bash-completion" / "completions" / "ssoclient", WriteBashCompletion(program));
    Write(share / "zsh" / "site-functions" / "_ssoclient", WriteZshCompletion(program));
    Write(share / "fish" / "vendor_completions.d" / "ssoclient.fish", WriteFishCompletion(program));
}

} // namespace

int main(int argc, char** argv)
try {
    if (argc != 2) {
        std::cerr << "usage: ssoclient_documents FOLDER\n";
        return 2;
    }
    WriteAll(argv[1]);
    return 0;
} catch (const std::exception& error) {
    std::cerr << error.what() << "\n";
    return 1;
}
