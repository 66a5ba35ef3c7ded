#include "xml/Arena.h"

#include "quillon/Wiped.h"

#include <algorithm>
#include <cstring>
#include <iterator>
#include <new>
#include <type_traits>
#include <utility>

namespace Quillon::Xml {

namespace {

constexpr std::size_t MinChunkSize = 1024;
constexpr std::size_t MaxChunkSize = std::size_t{256} * 1024;

// Nodes are never destroyed one by one.
static_assert(std::is_trivially_destructible_v<Attribute>);
static_assert(alignof(ElementNode) <= alignof(std::max_align_t));

constexpr std::size_t RoundUp(std::size_t size) noexcept
{
    constexpr std::size_t Alignment = alignof(ElementNode);
    return (size + Alignment - 1) / Alignment * Alignment;
}

} // namespace

Ref<Arena> Arena::Create(ArenaContent content, std::size_t expectedSize)
{
    Ref<Arena> arena(new Arena(content));
    if (expectedSize > InnerSize) {
        arena->AddChunk(expectedSize);
    }
    return arena;
}

Arena::~Arena()
{
    if (_content == ArenaContent::COMPOSED) {
        Wipe(_inner.data(), _inner.size());
        for (const Chunk& chunk : _chunks) {
            Wipe(chunk.memory.get(), chunk.size);
        }
    }
}

void intrusive_ptr_release(Arena* arena) noexcept
{
    Arena& root = arena->GetRoot();
    if (root._count.fetch_sub(1, std::memory_order_acq_rel) == 1) {
        delete &root;
    }
}

void Arena::AddChunk(std::size_t size)
{
    _chunks.push_back(Chunk{std::make_unique_for_overwrite<char[]>(size), size});
    _next = _chunks.back().memory.get();
    _left = size;
}

void* Arena::Allocate(std::size_t size)
{
    size = RoundUp(size);
    if (size > _left) {
        AddChunk(std::max(size, std::clamp(GetGrowth(), MinChunkSize, MaxChunkSize)));
    }
    void* memory = _next;
    _next += size;
    _left -= size;
    return memory;
}

/** How much more there should be; what the nodes of a text will need was estimated well. */
std::size_t Arena::GetGrowth() const noexcept
{
    return _content == ArenaContent::PARSED ? _source.size() / 4
           : _chunks.empty()                ? 0
                                            : 2 * _chunks.back().size;
}

std::string_view Arena::CopyText(std::string_view text)
{
    if (text.empty()) {
        return {};
    }
    char* copy = static_cast<char*>(Allocate(text.size()));
    std::memcpy(copy, text.data(), text.size());
    return {copy, text.size()};
}

ElementNode* Arena::NewElement(std::string_view name)
{
    return new (Allocate(sizeof(ElementNode))) ElementNode(this, name);
}

ElementNode* Arena::NewElementLike(const ElementNode& element)
{
    return new (Allocate(sizeof(ElementNode))) ElementNode(this, element);
}

TextNode* Arena::NewText(std::string_view text)
{
    return new (Allocate(sizeof(TextNode))) TextNode(this, text);
}

CommentNode* Arena::NewComment(std::string_view text)
{
    return new (Allocate(sizeof(CommentNode))) CommentNode(this, text);
}

ProcessingInstructionNode* Arena::NewProcessingInstruction(
    std::string_view target, std::string_view data)
{
    return new (Allocate(sizeof(ProcessingInstructionNode)))
        ProcessingInstructionNode(this, target, data);
}

void Arena::RemoveTopLevel(Node* node) noexcept
{
    Node** link = &_firstTopLevel;
    while (*link != nullptr && *link != node) {
        link = &(*link)->_nextSibling;
    }
    if (*link != nullptr) {
        *link = node->_nextSibling;
    }
}

void Arena::Merge(Arena& other)
{
    for (auto& merged : other._merged) {
        _merged.push_back(std::move(merged));
    }
    other._merged.clear();
    _merged.emplace_back(&other, [](Arena* arena) { delete arena; });
    other._mergedInto = this;
    _count.fetch_add(
        other._count.exchange(0, std::memory_order_relaxed), std::memory_order_relaxed);
}

} // namespace Quillon::Xml
