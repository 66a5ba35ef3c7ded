#include "devsts/misbehaviour/Channel.h"

#include <algorithm>
#include <array>
#include <new>
#include <openssl/err.h>
#include <poll.h>
#include <sys/socket.h>

namespace DevSts {

namespace {

using Buffer = std::array<char, 16384>;

SSL* MakeSsl(SSL_CTX* context)
{
    SSL* const ssl = SSL_new(context);
    BIO* const in = BIO_new(BIO_s_mem());
    BIO* const out = BIO_new(BIO_s_mem());
    if (ssl == nullptr || in == nullptr || out == nullptr) {
        throw std::bad_alloc();
    }
    SSL_set_bio(ssl, in, out);
    SSL_set_accept_state(ssl);
    return ssl;
}

} // namespace

bool Channel::Read(std::string& received)
{
    Buffer buffer;
    const ssize_t size = recv(_socket, buffer.data(), buffer.size(), 0);
    if (size <= 0) {
        return false;
    }
    received.append(buffer.data(), static_cast<std::size_t>(size));
    return true;
}

bool Channel::Write(const std::string& text)
{
    std::size_t done = 0;
    while (done < text.size()) {
        const ssize_t size = send(_socket, text.data() + done, text.size() - done, MSG_NOSIGNAL);
        if (size <= 0) {
            return false;
        }
        done += static_cast<std::size_t>(size);
    }
    return true;
}

void Channel::End()
{
    Vanish();
}

void Channel::Vanish() const
{
    shutdown(_socket, SHUT_WR);
}

void Channel::Drain() const
{
    Buffer buffer;
    while (recv(_socket, buffer.data(), buffer.size(), 0) > 0) {
    }
}

// To connect it to nowhere ends it like a close without linger, while the descriptor stays the
// caller's.
void Channel::Reset() const
{
    const linger atOnce{1, 0};
    setsockopt(_socket, SOL_SOCKET, SO_LINGER, &atOnce, sizeof atOnce);
    const sockaddr nowhere{AF_UNSPEC, {}};
    static_cast<void>(connect(_socket, &nowhere, sizeof nowhere));
}

bool Channel::Pause(long milliseconds) const
{
    pollfd end{_socket, POLLRDHUP, 0};
    return poll(&end, 1, static_cast<int>(milliseconds)) == 0;
}

SecureChannel::SecureChannel(int socket, SSL_CTX* context, Tampering tampering)
    : Channel(socket)
    , _ssl(MakeSsl(context))
    , _tampering(tampering)
{}

SecureChannel::~SecureChannel()
{
    SSL_free(_ssl);
}

bool SecureChannel::MakeHandshake()
{
    for (;;) {
        const int result = SSL_do_handshake(_ssl);
        const int error = SSL_get_error(_ssl, result);
        ERR_clear_error();
        if (!Flush()) {
            return false;
        }
        if (result == 1) {
            return true;
        }
        if (error != SSL_ERROR_WANT_READ || !Fetch()) {
            return false;
        }
    }
}

bool SecureChannel::Read(std::string& received)
{
    Buffer buffer;
    for (;;) {
        const int size = SSL_read(_ssl, buffer.data(), static_cast<int>(buffer.size()));
        const int error = SSL_get_error(_ssl, size);
        ERR_clear_error();
        Flush();
        if (size > 0) {
            received.append(buffer.data(), static_cast<std::size_t>(size));
            return true;
        }
        if (error != SSL_ERROR_WANT_READ || !Fetch()) {
            return false;
        }
    }
}

bool SecureChannel::Write(const std::string& text)
{
    const bool isWritten = SSL_write(_ssl, text.data(), static_cast<int>(text.size())) > 0;
    ERR_clear_error();
    return Flush() && isWritten;
}

void SecureChannel::End()
{
    SSL_shutdown(_ssl);
    ERR_clear_error();
    Flush();
    Channel::End();
}

bool SecureChannel::Renegotiate()
{
    const bool isAsked = SSL_renegotiate(_ssl) == 1 && SSL_do_handshake(_ssl) == 1;
    ERR_clear_error();
    return Flush() && isAsked;
}

bool SecureChannel::UpdateKeys()
{
    const bool isAsked =
        SSL_key_update(_ssl, SSL_KEY_UPDATE_REQUESTED) == 1 && SSL_do_handshake(_ssl) == 1;
    ERR_clear_error();
    return Flush() && isAsked;
}

bool SecureChannel::SendTicket()
{
    const bool isSent = SSL_new_session_ticket(_ssl) == 1 && SSL_do_handshake(_ssl) == 1;
    ERR_clear_error();
    return Flush() && isSent;
}

/** Sends what OpenSSL has ready. @return false if no more can be sent. */
bool SecureChannel::Flush()
{
    char* data = nullptr;
    const long size = BIO_get_mem_data(SSL_get_wbio(_ssl), &data);
    if (size <= 0 || !_isOpen) {
        return _isOpen;
    }
    std::string octets(data, static_cast<std::size_t>(size));
    (void)BIO_reset(SSL_get_wbio(_ssl));
    Tamper(octets);
    _isOpen = Channel::Write(octets) && _isOpen;
    return _isOpen;
}

void SecureChannel::Tamper(std::string& octets)
{
    const long changeAt = _tampering.changeAt - _sent;
    if (changeAt >= 0 && changeAt < static_cast<long>(octets.size())) {
        octets[static_cast<std::size_t>(changeAt)] ^= 1;
    }
    const long left = _tampering.cutAt - _sent;
    if (_tampering.cutAt >= 0 && left < static_cast<long>(octets.size())) {
        octets.resize(static_cast<std::size_t>(left));
        _isOpen = false;
    }
    _sent += static_cast<long>(octets.size());
}

bool SecureChannel::Fetch()
{
    std::string octets;
    return Channel::Read(octets)
           && BIO_write(SSL_get_rbio(_ssl), octets.data(), static_cast<int>(octets.size())) > 0;
}

} // namespace DevSts
