#include "PrivateKeys.h"

#include "ExitCode.h"
#include "Files.h"

#include "quillon/MessageFormatter.h"
#include "quillon/StringUtil.h"

#include <string_view>

using Quillon::MessageFormatter;
using Quillon::Wiped;
using Quillon::Crypto::PassphraseCallback;
using Quillon::Crypto::PrivateKey;

namespace {

/** `text`, which names the URI of a key, without the PIN that the URI may have [RFC 7512 2.4]. */
std::string HidePin(std::string text, const std::string& uri)
{
    constexpr std::string_view Attribute = "pin-value=";
    constexpr std::string_view Ends = "&;";
    const std::size_t found = Quillon::StringUtil::ToLower(uri).find(Attribute);
    if (found == std::string::npos) {
        return text;
    }
    const std::size_t first = found + Attribute.size();
    const std::string pin = uri.substr(first, uri.find_first_of(Ends, first) - first);
    for (std::size_t at = 0; !pin.empty() && (at = text.find(pin, at)) != std::string::npos;) {
        text.replace(at, pin.size(), "...");
        at += 3;
    }
    return text;
}

} // namespace

bool IsUri(const std::string& key)
{
    constexpr char SchemeCharacters[] =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+-.";
    const std::size_t end = key.find_first_not_of(SchemeCharacters);
    return end != 0 && end != std::string::npos && key[end] == ':';
}

Quillon::Ref<const PrivateKey> ReadPrivateKey(
    const std::string& key, const SecretKind& kind, const std::string& passphraseFile)
{
    // A store may ask more than once; the user is asked once.
    Wiped passphrase;
    const PassphraseCallback getPassphrase = [&] {
        if (passphrase.Get().empty()) {
            GetSecret(kind, passphraseFile, passphrase);
        }
        return passphrase.Get();
    };
    if (IsUri(key)) {
        return Quillon::Crypto::LoadPrivateKey(key, getPassphrase);
    }
    const Wiped file(ReadFile(key));
    return Quillon::Crypto::CreatePrivateKey(file.Get(), getPassphrase);
}

// Of a URI the text has the name already.
void ThrowKeyError(const std::string& key, const std::string& reason)
{
    throw UsageError(
        IsUri(key)
            ? MessageFormatter::ASPrint("cannot use the private key: %1", HidePin(reason, key))
            : MessageFormatter::ASPrint("cannot use the private key `%1': %2", key, reason));
}
