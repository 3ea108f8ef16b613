// The report of what a run left unread in its parameter file. The look-ups by
// name mark the nodes they find and keep the names asked for in each node; once
// the run has read its settings, every target, section or keyword without a
// mark is either a name the run does not know (a misspelt key, a key in the
// wrong letter case, a section of another program) or a repeat of a name of
// which another instance was read. The first gets the nearest name asked for
// in the same parent, the second the lines of both instances.
//
// Nodes are stored in file order, so one pass over the store walks the file
// from top to bottom without a stack, deep nesting too.
#include <algorithm>
#include <string>
#include <vector>

#include "platform/kvt/kvt_internal.hpp"

namespace {

char LowerCase(char c) {
    return (c >= 'A' && c <= 'Z') ? static_cast<char>(c - 'A' + 'a') : c;
}

// Edit distance in half steps: inserting, deleting or replacing a character
// costs 2, replacing a letter by the same letter in the other case 1, so that
// a name in the wrong case is nearer than any misspelling.
int Distance(const std::string& a, const std::string& b) {
    std::vector<int> row(b.size() + 1), next(b.size() + 1);
    for (size_t j = 0; j <= b.size(); ++j) row[j] = 2 * static_cast<int>(j);
    for (size_t i = 1; i <= a.size(); ++i) {
        next[0] = 2 * static_cast<int>(i);
        for (size_t j = 1; j <= b.size(); ++j) {
            const char x = a[i - 1], y = b[j - 1];
            const int replace = x == y ? 0 : LowerCase(x) == LowerCase(y) ? 1 : 2;
            next[j] = std::min({row[j - 1] + replace, row[j] + 2, next[j - 1] + 2});
        }
        std::swap(row, next);
    }
    return row[b.size()];
}

// The name of node's kind asked for in its parent that is nearest to its own,
// or "" when none is within max(2, length / 3) edits.
std::string Nearest(const KvtTree& tree, const KvtNode& node) {
    const KvtAsked* asked = tree.nodes[node.parent].asked.get();
    if (asked == nullptr) return "";
    const char kind = KvtIndexKey(node.kind, "")[0];
    const int limit = 2 * std::max(2, static_cast<int>(node.name.size()) / 3);
    std::string best;
    int bestDistance = limit + 1;
    for (const std::string& key : asked->names) {
        if (key[0] != kind) continue;
        const std::string name = key.substr(1);
        const int d = Distance(node.name, name);
        if (d > 0 && d < bestDistance) {
            best = name;
            bestDistance = d;
        }
    }
    return best;
}

// "Key Name in section Parent", "Section Name in target Parent", "Target Name".
std::string Naming(const KvtTree& tree, const KvtNode& node) {
    const char* what = node.kind == KvtNodeKind::Keyword   ? "Key "
                       : node.kind == KvtNodeKind::Section ? "Section "
                                                           : "Target ";
    std::string text = what + node.name;
    const KvtNode& parent = tree.nodes[node.parent];
    if (parent.kind == KvtNodeKind::Target) text += " in target " + parent.name;
    if (parent.kind == KvtNodeKind::Section) text += " in section " + parent.name;
    return text;
}

}  // namespace

int kvtReportUnread(KvtHandle file, KvtReportFn report, void* data) {
    int index = -1;
    KvtTree* tree = KvtFindTree(file, &index);
    if (tree == nullptr) return 0;
    if (tree->nodes[index].kind == KvtNodeKind::Keyword ||
        tree->nodes[index].kind == KvtNodeKind::Param) {
        KvtSetError(kKvtErrHandle);
        return 0;
    }
    // Within the node given: the file, or a target or section and what it holds.
    auto inside = [&](size_t i) {
        for (int up = tree->nodes[i].parent; up >= 0; up = tree->nodes[up].parent)
            if (up == index) return true;
        return false;
    };
    int count = 0;
    for (size_t i = 1; i < tree->nodes.size(); ++i) {
        const KvtNode& node = tree->nodes[i];
        if (node.kind == KvtNodeKind::Param || node.read) continue;
        if (index != 0 && !inside(i)) continue;
        // Inside an unread section only the section itself is reported.
        const KvtNode& parent = tree->nodes[node.parent];
        if (parent.kind != KvtNodeKind::File && !parent.read) continue;
        int readLine = -1;
        for (int other : KvtInstances(*tree, node.parent, node.kind, node.name)) {
            if (tree->nodes[other].read) {
                readLine = tree->nodes[other].line;
                break;
            }
        }
        std::string text = Naming(*tree, node);
        if (readLine >= 0) {
            const int first = std::min(readLine, node.line), second = std::max(readLine, node.line);
            text += " is given twice, on lines " + std::to_string(first) + " and " +
                    std::to_string(second) + "; the one on line " + std::to_string(readLine) +
                    " stands";
        } else {
            text += " (line " + std::to_string(node.line) + ") is not read by this run";
            const std::string nearest = Nearest(*tree, node);
            if (!nearest.empty()) text += "; did you mean " + nearest + "?";
        }
        ++count;
        if (report != nullptr) report(text.c_str(), data);
    }
    KvtSetError(kKvtOk);
    return count;
}
