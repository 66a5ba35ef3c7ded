#pragma once

#include <filesystem>
#include <gssapi/gssapi.h>
#include <memory>
#include <stdexcept>
#include <string>

// The service's side of SPNEGO with Kerberos inside, over MIT's GSS-API.

namespace DevSts {

/** GSS refuses; the text is its own. */
class GssError : public std::runtime_error
{
public:
    using std::runtime_error::runtime_error;
};

struct GssDeleter
{
    void operator()(gss_cred_id_t credential) const;
    void operator()(gss_ctx_id_t context) const;
    void operator()(gss_name_t name) const;
};
using GssCredential = std::unique_ptr<std::remove_pointer_t<gss_cred_id_t>, GssDeleter>;
using GssContext = std::unique_ptr<std::remove_pointer_t<gss_ctx_id_t>, GssDeleter>;
using GssName = std::unique_ptr<std::remove_pointer_t<gss_name_t>, GssDeleter>;

/**
 * The services whose keys stand in a keytab. Neither the keytab nor the replay cache comes from
 * the environment.
 *
 * Thread safety: any number of threads.
 */
class Acceptor
{
public:
    /**
     * @param replays  the file that remembers tickets' authenticators, so that each works once.
     * @throws GssError  the keytab cannot be used.
     */
    Acceptor(const std::filesystem::path& keytab, const std::filesystem::path& replays);

    gss_cred_id_t Get() const { return _credential.get(); }

private:
    GssCredential _credential;
};

/**
 * One negotiation.
 *
 * Thread safety: one thread at a time.
 */
class SecurityContext
{
public:
    /**
     * Takes the client's next leg and gives the one for the client, which is empty if there is
     * nothing to say.
     *
     * @throws GssError  the client is refused; the negotiation cannot go on.
     */
    std::string Accept(const Acceptor& acceptor, const std::string& leg);

    bool IsComplete() const { return _isComplete; }

    /** The client, NAME@REALM; known once complete. */
    const std::string& Principal() const { return _principal; }

private:
    GssContext _context;
    bool _isComplete = false;
    std::string _principal;
};

} // namespace DevSts
