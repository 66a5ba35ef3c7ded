#pragma once

#include <cstddef>
#include <memory_resource>
#include <string_view>
#include <vector>

namespace Quillon::Xml::Security {

/** What a prefix is bound to at some point of a walk; an empty URI is none. */
struct PrefixState
{
    std::string_view prefix;
    std::string_view inScope;
    /** The URI that the nearest output ancestor has rendered for the prefix. */
    std::string_view rendered;
};

/**
 * The states of the prefixes that are in scope, with a log to bring back how they were: one look-up
 * tells everything about a prefix. It holds no more of them than a document may have in scope.
 */
class PrefixTable
{
public:
    /** @param memory  has room for more prefixes than most documents have; outlives the table. */
    explicit PrefixTable(std::pmr::memory_resource& memory)
        : _states(&memory)
        , _log(&memory)
    {
        _states.reserve(UsualPrefixes);
        _log.reserve(2 * UsualPrefixes);
    }

    PrefixState* Find(std::string_view prefix) noexcept
    {
        for (PrefixState& state : _states) {
            if (HasPrefix(state, prefix)) {
                return &state;
            }
        }
        return nullptr;
    }

    void Bind(std::string_view prefix, std::string_view uri)
    {
        PrefixState* state = Find(prefix);
        if (state == nullptr) {
            _log.push_back(Change{_states.size(), {}, true});
            _states.push_back(PrefixState{prefix, uri, {}});
            return;
        }
        Log(*state);
        state->inScope = uri;
    }

    void SetRendered(PrefixState& state)
    {
        Log(state);
        state.rendered = state.inScope;
    }

    std::pmr::vector<PrefixState>& GetAll() noexcept { return _states; }

    std::size_t GetMark() const noexcept { return _log.size(); }

    /** Undoes every change since the mark was taken. */
    void Restore(std::size_t mark) noexcept
    {
        while (_log.size() > mark) {
            if (_log.back().isNew) {
                _states.pop_back();
            } else {
                _states[_log.back().index] = _log.back().state;
            }
            _log.pop_back();
        }
    }

private:
    static constexpr std::size_t UsualPrefixes = 8;

    struct Change
    {
        std::size_t index;
        PrefixState state; ///< what it was
        bool isNew;        ///< it was not there
    };

    /** Prefixes are a few octets long: comparing them in place beats a call. */
    static bool HasPrefix(const PrefixState& state, std::string_view prefix) noexcept
    {
        if (state.prefix.size() != prefix.size()) {
            return false;
        }
        for (std::size_t i = 0; i < prefix.size(); ++i) {
            if (state.prefix[i] != prefix[i]) {
                return false;
            }
        }
        return true;
    }

    void Log(const PrefixState& state)
    {
        _log.push_back(Change{static_cast<std::size_t>(&state - _states.data()), state, false});
    }

    std::pmr::vector<PrefixState> _states;
    std::pmr::vector<Change> _log;
};

} // namespace Quillon::Xml::Security
