// Compares two parameter trees node by node: structure, names, kinds and
// values bit for bit (a NaN equals a NaN of the same sign; its payload is not
// written). Shared by the tests and the fuzzer.
#pragma once

#include <cmath>
#include <cstring>
#include <string>

#include "platform/kvt/kvt_internal.hpp"

inline bool KvtSameReal(double a, double b) {
    if (std::isnan(a) && std::isnan(b)) return std::signbit(a) == std::signbit(b);
    return std::memcmp(&a, &b, sizeof a) == 0;
}

// Every value field, not only that of the kind: the others keep their defaults.
inline bool KvtSameValue(const KvtNode& x, const KvtNode& y) {
    // A 32-bit real is written with 9 digits: it comes back as the same float.
    const bool sameReal = x.single || y.single
                              ? KvtSameReal(static_cast<float>(x.real), static_cast<float>(y.real))
                              : KvtSameReal(x.real, y.real);
    return x.valueKind == y.valueKind && x.integer == y.integer && sameReal &&
           x.logical == y.logical && x.text == y.text;
}

// Empty when the trees are equal, else where they first differ.
inline std::string KvtTreeDifference(KvtHandle a, KvtHandle b) {
    int ia = -1, ib = -1;
    KvtTree* ta = KvtFindTree(a, &ia);
    KvtTree* tb = KvtFindTree(b, &ib);
    if (ta == nullptr || tb == nullptr) return "bad handle";
    if (ta->nodes.size() != tb->nodes.size())
        return "node count " + std::to_string(ta->nodes.size()) + " vs " +
               std::to_string(tb->nodes.size());
    for (size_t i = 0; i < ta->nodes.size(); ++i) {
        const KvtNode& x = ta->nodes[i];
        const KvtNode& y = tb->nodes[i];
        if (x.kind != y.kind || x.name != y.name || x.parent != y.parent || x.level != y.level ||
            x.children != y.children || (x.kind == KvtNodeKind::Param && !KvtSameValue(x, y)))
            return "node " + std::to_string(i) + " (" + x.name + ")";
    }
    return "";
}
