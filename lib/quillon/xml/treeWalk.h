#pragma once

#include "quillon/xml/Node.h"

namespace Quillon::Xml {

/** Hands one node that is not an element to its `Visit`. */
template <class Visitor>
void VisitLeaf(const Node& node, Visitor& visitor)
{
    switch (node.GetNodeType()) {
    case NodeType::TEXT:
        visitor.Visit(static_cast<const TextNode&>(node));
        break;
    case NodeType::COMMENT:
        visitor.Visit(static_cast<const CommentNode&>(node));
        break;
    case NodeType::PROCESSING_INSTRUCTION:
        visitor.Visit(static_cast<const ProcessingInstructionNode&>(node));
        break;
    case NodeType::ELEMENT:
        break;
    }
}

/**
 * Walks the tree under `apex` in document order: `Enter` and `Leave` for each element, `Visit`
 * for every other node. The subtree `excluded` is passed over. Needs no stack, however deep the
 * tree is.
 */
template <class Visitor>
void WalkTree(const ElementNode& apex, const Node* excluded, Visitor& visitor)
{
    const ElementNode* parent = &apex;
    visitor.Enter(apex);
    const Node* node = apex.GetFirstChild();
    while (node != nullptr || parent != &apex) {
        if (node == nullptr) {
            visitor.Leave(*parent);
            node = parent->GetNextSibling();
            parent = parent->GetParent();
        } else if (node == excluded) {
            node = node->GetNextSibling();
        } else if (const ElementNode* element = AsElement(node)) {
            visitor.Enter(*element);
            parent = element;
            node = element->GetFirstChild();
        } else {
            VisitLeaf(*node, visitor);
            node = node->GetNextSibling();
        }
    }
    visitor.Leave(apex);
}

} // namespace Quillon::Xml
