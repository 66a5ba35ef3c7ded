#pragma once

#include "quillon/xml/Node.h"

#include <array>
#include <atomic>
#include <cstddef>
#include <memory>
#include <string_view>
#include <vector>

namespace Quillon::Xml {

/** Whether what an arena held is wiped when it is freed. */
enum class ArenaContent
{
    PARSED,  ///< text from outside
    COMPOSED ///< may hold a password
};

/**
 * The memory of a tree. Nodes and their text are allocated one after another and freed all at
 * once, when the last reference to any of them goes.
 *
 * Two trees become one when a node is appended to another tree: the child's arena is merged into
 * the parent's, which takes over its memory and its references. Nodes keep pointing to the arena
 * that made them; `GetRoot` finds the one that counts.
 */
class Arena
{
public:
    /** @param expectedSize  how much is going to be allocated, as far as that is known. */
    static Ref<Arena> Create(ArenaContent content, std::size_t expectedSize = 0);

    Arena(const Arena&) = delete;
    Arena& operator=(const Arena&) = delete;

    /** The arena that made `node`. */
    static Arena& Of(const Node& node) noexcept { return *node._arena; }

    /** Uninitialised memory, aligned for any node, that lives as long as the arena. */
    void* Allocate(std::size_t size);

    /** A copy of `text` that lives as long as the arena. */
    std::string_view CopyText(std::string_view text);

    ElementNode* NewElement(std::string_view name);

    /** With the name and the attributes of `element`, which is of this arena too. */
    ElementNode* NewElementLike(const ElementNode& element);
    TextNode* NewText(std::string_view text);
    CommentNode* NewComment(std::string_view text);
    ProcessingInstructionNode* NewProcessingInstruction(
        std::string_view target, std::string_view data);

    /** Takes over the memory and the references of `other`, from now on one arena with this. */
    void Merge(Arena& other);

    Arena& GetRoot() noexcept
    {
        Arena* arena = this;
        while (arena->_mergedInto != nullptr) {
            arena = arena->_mergedInto;
        }
        return *arena;
    }

    /** The parsed text, which lives as long as this arena; empty for a composed tree. */
    std::string_view GetSource() const noexcept { return _source; }
    void SetSource(std::string_view source) noexcept { _source = source; }

    /** The first node of the parsed document; null for a composed tree. */
    Node* GetFirstTopLevel() const noexcept { return _firstTopLevel; }
    void SetFirstTopLevel(Node* node) noexcept { _firstTopLevel = node; }

    /** Takes `node` out of the document's top level, if it stands there. */
    void RemoveTopLevel(Node* node) noexcept;

    friend void intrusive_ptr_add_ref(Arena* arena) noexcept
    {
        arena->GetRoot()._count.fetch_add(1, std::memory_order_relaxed);
    }
    friend void intrusive_ptr_release(Arena* arena) noexcept;

private:
    struct Chunk
    {
        std::unique_ptr<char[]> memory;
        std::size_t size;
    };

    // The inner memory is left as it is: what is allocated of it is written first.
    explicit Arena(ArenaContent content) noexcept // NOLINT(cppcoreguidelines-pro-type-member-init)
        : _content(content)
    {}
    ~Arena();

    void AddChunk(std::size_t size);
    std::size_t GetGrowth() const noexcept;

    std::atomic<unsigned> _count{0};
    Arena* _mergedInto = nullptr;
    std::vector<std::unique_ptr<Arena, void (*)(Arena*)>> _merged;
    ArenaContent _content;
    std::vector<Chunk> _chunks;
    // A composed element with a few attributes and a short text needs no other memory.
    static constexpr std::size_t InnerSize = 384;
    alignas(std::max_align_t) std::array<char, InnerSize> _inner;
    char* _next = _inner.data();
    std::size_t _left = InnerSize;
    std::string_view _source;
    Node* _firstTopLevel = nullptr;
};

} // namespace Quillon::Xml
