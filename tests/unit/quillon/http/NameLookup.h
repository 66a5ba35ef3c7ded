#pragma once

namespace Testing::NameLookup {

/** A host whose look-up hangs as long as there is a `Block`. */
inline constexpr char BlockedHost[] = "blocked.invalid";

/** A host that is not known. */
inline constexpr char UnknownHost[] = "unknown.invalid";

/** A host with two addresses, 127.0.0.2 before 127.0.0.1. */
inline constexpr char TwoAddressHost[] = "two.invalid";

/** Whether the calling thread takes none of the signals that concern a library. */
bool AreSignalsBlocked();

/** What is known of a look-up that hangs. */
struct Lookup
{
    bool withoutSignals = false; ///< of the thread that looks up
};

class Block
{
public:
    Block();
    ~Block();
    Block(const Block&) = delete;
    Block& operator=(const Block&) = delete;

    /** Returns when someone looks the host up. */
    Lookup WaitUntilAsked();
};

} // namespace Testing::NameLookup
