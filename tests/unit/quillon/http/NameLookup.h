#pragma once

namespace Testing::NameLookup {

/** A host whose look-up hangs as long as there is a `Block`. */
inline constexpr char BlockedHost[] = "blocked.invalid";

/** A host that is not known. */
inline constexpr char UnknownHost[] = "unknown.invalid";

class Block
{
public:
    Block();
    ~Block();
    Block(const Block&) = delete;
    Block& operator=(const Block&) = delete;

    /** Returns when someone looks the host up. */
    void WaitUntilAsked();
};

} // namespace Testing::NameLookup
