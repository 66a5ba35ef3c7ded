#pragma once

#include "quillon/Wiped.h"

#include <string>

/** A secret by the words that questions and errors use for it. */
struct SecretKind
{
    const char* name;
    const char* prompt;
    const char* fileOption; ///< the option that names a file with it
};

inline constexpr SecretKind Password = {"password", "Password: ", "--password-file"};
inline constexpr SecretKind KeyPassphrase = {
    "key passphrase", "Key passphrase: ", "--key-passphrase-file"};
inline constexpr SecretKind DecryptionKeyPassphrase = {
    "passphrase of the decryption key",
    "Passphrase of the decryption key: ",
    "--decrypt-passphrase-file"};

/**
 * Gets a secret, which may be any octets: the first line of the file, of standard input for `-`, or
 * what the user types at the terminal without echo if `file` is empty.
 *
 * @throws UsageError  it cannot be read, is empty or too long.
 */
void GetSecret(const SecretKind& kind, const std::string& file, Quillon::Wiped& secret);

/**
 * Gets a password, which goes into the request.
 *
 * @throws UsageError  as `GetSecret`, or it is nothing that XML can hold.
 */
void GetPassword(const std::string& file, Quillon::Wiped& password);
