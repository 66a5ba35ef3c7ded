#include "devsts/http/Server.h"
#include "devsts/http/Versions.h"
#include "devsts/misbehaviour/MisbehavingServer.h"

#include <CLI/CLI.hpp>
#include <csignal>
#include <cstdio>
#include <exception>
#include <iostream>
#include <pthread.h>
#include <regex>
#include <stdexcept>

namespace {

class UsageError : public std::runtime_error
{
public:
    using std::runtime_error::runtime_error;
};

// The signals are blocked before any thread exists, so that all of them inherit it and only
// sigwait takes one.
sigset_t BlockStopSignals()
{
    sigset_t signals;
    sigemptyset(&signals);
    sigaddset(&signals, SIGTERM);
    sigaddset(&signals, SIGINT);
    pthread_sigmask(SIG_BLOCK, &signals, nullptr);
    return signals;
}

void SetAddress(DevSts::Options& options, const std::string& listen)
{
    static const std::regex pattern(R"((?:\[([0-9A-Fa-f:.]+)\]|([^:\[\]]+)):(\d{1,5}))");
    std::smatch parts;
    if (!std::regex_match(listen, parts, pattern) || std::stoi(parts[3].str()) > 65535) {
        throw UsageError("--listen wants HOST:PORT or [IPv6]:PORT, not " + listen);
    }
    options.host = parts[1].matched ? parts[1].str() : parts[2].str();
    options.port = std::stoi(parts[3].str());
}

template <class ServerKind>
void ServeUntilStopped(const DevSts::Options& options, const sigset_t& signals, ServerKind& server)
{
    std::cerr << "For development only: keys and passwords lie in plain files in "
              << options.stateDir.string() << std::endl;
    std::cout << "listening on " << server.Url() << std::endl;
    int received = 0;
    sigwait(&signals, &received);
    server.Stop();
}

void Serve(const DevSts::Options& options)
{
    const sigset_t signals = BlockStopSignals();
    DevSts::Server server(options);
    server.Start();
    if (!options.keytab.empty()) {
        std::cerr << "Negotiates Kerberos with the keytab " << options.keytab.string() << std::endl;
    }
    ServeUntilStopped(options, signals, server);
}

void PrintMisbehaviours()
{
    for (const DevSts::Misbehaviour& row : DevSts::ListMisbehaviours()) {
        std::cout << row.name << (row.parameter ? ":N" : "") << "\t" << row.about
                  << (!row.isOverHttp ? " (HTTPS)" : "") << "\n";
    }
}

DevSts::Misbehaviour FindMisbehaviour(const std::string& name)
{
    try {
        return DevSts::FindMisbehaviour(name);
    } catch (const std::invalid_argument& error) {
        throw UsageError(std::string(error.what()) + " (see: ssoclient-devsts --misbehave list)");
    }
}

void Misbehave(const DevSts::Options& options, const std::string& name)
{
    const DevSts::Misbehaviour misbehaviour = FindMisbehaviour(name);
    if (options.plainHttp && !misbehaviour.isOverHttp) {
        throw UsageError(name + " needs HTTPS: leave out --http");
    }
    if (!options.keytab.empty()) {
        throw UsageError("--misbehave goes without --keytab");
    }
    const sigset_t signals = BlockStopSignals();
    DevSts::MisbehavingServer server(options, misbehaviour);
    server.Start();
    std::cerr << "Misbehaves: " << misbehaviour.about << std::endl;
    ServeUntilStopped(options, signals, server);
}

int Run(int argc, char** argv)
{
    CLI::App app("A WS-Trust 1.3 security token service for development and tests.");
    app.footer(
        "The state directory is made on first start. It holds ca.pem (trust it for TLS), sts.pem\n"
        "(trust it for tokens), client.pem and client.key (a client identity that the STS knows\n"
        "as a solution user), and users.json (the users and their passwords; it explains its\n"
        "fields, and is read again for every request). With a keytab, the Kerberos principal\n"
        "NAME@REALM logs on as the user of that name, in any letter case, and kerberos.replays\n"
        "remembers what has been received. SIGTERM or SIGINT ends the program.");
    DevSts::Options options;
    options.keptRequests = 0;
    std::string listen = "127.0.0.1:0";
    app.add_option("--state", options.stateDir, "the state directory; required");
    app.add_option("--listen", listen, "address and port; port 0 takes any free one")
        ->capture_default_str();
    app.add_option(
        "--keytab",
        options.keytab,
        "a Kerberos keytab with keys of this service; clients may then negotiate");
    std::string misbehaviour;
    app.add_option(
        "--misbehave",
        misbehaviour,
        "do one thing wrong on every connection, for tests of clients; list prints what there is");
    app.set_version_flag("--version", "ssoclient-devsts " + DevSts::DescribeVersions());
    app.add_flag("--http", options.plainHttp, "serve plain HTTP instead of HTTPS");
    try {
        app.parse(argc, argv);
    } catch (const CLI::Success& request) {
        return app.exit(request); // prints the help or the version
    } catch (const CLI::ParseError& error) {
        throw UsageError(error.what());
    }
    if (misbehaviour == "list") {
        PrintMisbehaviours();
        return 0;
    }
    if (options.stateDir.empty()) {
        throw UsageError("--state is required");
    }
    SetAddress(options, listen);
    if (misbehaviour.empty()) {
        Serve(options);
    } else {
        Misbehave(options, misbehaviour);
    }
    return 0;
}

} // namespace

int main(int argc, char** argv)
{
    try {
        return Run(argc, argv);
    } catch (const std::exception& error) {
        std::fprintf(stderr, "ssoclient-devsts: %s\n", error.what());
        return dynamic_cast<const UsageError*>(&error) != nullptr ? 2 : 1;
    }
}
