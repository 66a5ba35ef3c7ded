#pragma once

#include <memory>
#include <openssl/ssl.h>
#include <string>

namespace DevSts {

/** The octets of one accepted connection, whose socket is the caller's. */
class Channel
{
public:
    explicit Channel(int socket)
        : _socket(socket)
    {}
    virtual ~Channel() = default;
    Channel(const Channel&) = delete;
    Channel& operator=(const Channel&) = delete;

    /** Appends what has come. @return false at the end. */
    virtual bool Read(std::string& received);

    /** @return false if the client takes no more. */
    virtual bool Write(const std::string& text);

    /** Says that nothing more comes. */
    virtual void End();

    /** Ends with no word of TLS's own. */
    void Vanish() const;

    /**
     * Reads what still comes, until the client ends its side: a socket that is closed with octets
     * unread takes back what was just sent.
     */
    void Drain() const;

    /** Ends at once, with a reset. */
    void Reset() const;

    /** @return false if the client has gone by then. */
    bool Pause(long milliseconds) const;

private:
    const int _socket;
};

/** How the octets of a server's handshake differ from what OpenSSL wants to send. */
struct Tampering
{
    long cutAt = -1;    ///< how many octets get out; -1 for all
    long changeAt = -1; ///< the place of the octet that is changed; -1 for none
};

/** A channel under TLS. */
class SecureChannel : public Channel
{
public:
    SecureChannel(int socket, SSL_CTX* context, Tampering tampering);
    ~SecureChannel() override;

    /** @return whether it succeeded. */
    bool MakeHandshake();

    bool Read(std::string& received) override;
    bool Write(const std::string& text) override;
    void End() override;

    /** Asks the client for a new handshake, which TLS 1.2 still knows. */
    bool Renegotiate();

    /** Asks the client for new keys, of which TLS 1.3 has any number. */
    bool UpdateKeys();

    /** Hands out one more ticket of TLS 1.3. */
    bool SendTicket();

private:
    bool Flush();
    bool Fetch();
    void Tamper(std::string& octets);

    SSL* const _ssl; ///< between two buffers, so that what leaves is seen
    const Tampering _tampering;
    long _sent = 0;
    bool _isOpen = true; ///< and may still be spoken on
};

} // namespace DevSts
