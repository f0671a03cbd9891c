// Compile-time check of an SBR decoding tree: a complete binary code whose leaves are exactly
// the deltas -offset..offset.
#pragma once

#include <cstddef>
#include <cstdint>

namespace vorcal::aacparse {

template <std::size_t N>
constexpr bool CompleteTree(const int32_t (&tree)[N][2], int32_t offset)
{
    if (2 * offset + 1 != static_cast<int32_t>(N) + 1 || offset > 63)
        return false;
    bool referenced[N] = {};
    bool leaf[2 * 64 + 1] = {};
    std::size_t leaves = 0;
    for (std::size_t k = 0; k < N; ++k)
        for (int32_t entry : tree[k]) {
            if (entry >= 0) {
                // Nodes are numbered breadth first, so a child always follows its parent, and
                // each node has exactly one parent: the tree has no cycles and no sharing.
                if (static_cast<std::size_t>(entry) <= k || static_cast<std::size_t>(entry) >= N || referenced[entry])
                    return false;
                referenced[entry] = true;
            } else {
                const int32_t delta = entry + 64;
                if (delta < -offset || delta > offset || leaf[delta + 64])
                    return false;
                leaf[delta + 64] = true;
                ++leaves;
            }
        }
    for (std::size_t k = 1; k < N; ++k)
        if (!referenced[k])
            return false;
    return leaves == N + 1;
}

} // namespace vorcal::aacparse
