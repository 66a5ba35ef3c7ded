#pragma once

#include <string>

/** Text that is overwritten when it is no longer needed. */
class SecretText
{
public:
    /** Room for the longest line that is read, so that the text never moves and leaves a copy. */
    static constexpr std::size_t MaxBytes = 4096;

    SecretText() { _text.reserve(MaxBytes); }
    SecretText(const SecretText&) = delete;
    SecretText& operator=(const SecretText&) = delete;
    ~SecretText();

    /** Appends `c` unless that would take the text over `MaxBytes`. @return whether it did. */
    bool Append(char c);
    void RemoveLast() { _text.pop_back(); }
    void Clear();

    const std::string& Get() const noexcept { return _text; }

private:
    std::string _text;
};

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

/**
 * Gets a secret: the first line of the file, of standard input for `-`, or what the user types at
 * the terminal without echo if `file` is empty.
 *
 * @throws UsageError  it cannot be read, is empty or too long.
 */
void GetSecret(const SecretKind& kind, const std::string& file, SecretText& secret);
