// Building a tree call by call, and writing any tree, built or loaded, in the
// loader's syntax: four blanks of indentation a level, one keyword a line,
// reals with enough digits to load back bit for bit (17 significant digits
// for 64-bit reals, 9 for 32-bit ones), texts and file names escaped.
#include <charconv>
#include <cmath>
#include <cstring>
#include <fstream>
#include <string>
#include <vector>

#include "platform/kvt/kvt_internal.hpp"

namespace {

// ---- building ----------------------------------------------------------------

// The tree of a handle that must be a file handle, else nullptr with the error set.
KvtTree* BuildTree(KvtHandle file) {
    int index = -1;
    KvtTree* tree = KvtFindTree(file, &index);
    if (tree == nullptr) return nullptr;
    if (index != 0) {
        KvtSetError(kKvtErrHandle);
        return nullptr;
    }
    return tree;
}

// Opens a target (at the top) or a section (below the block open last).
int OpenBlock(KvtHandle file, const char* name, bool target) {
    KvtTree* tree = BuildTree(file);
    if (tree == nullptr) return gKvtError;
    if (!KvtValidName(name)) return KvtSetError(kKvtErrName);
    if (target != tree->openPath.empty()) return KvtSetError(kKvtErrBuild);
    const int parent = target ? 0 : tree->openPath.back();
    const KvtNodeKind kind = target ? KvtNodeKind::Target : KvtNodeKind::Section;
    tree->openPath.push_back(KvtAddNode(*tree, parent, kind, name));
    tree->lastKeyword = -1;
    return KvtSetError(kKvtOk);
}

// A new parameter of the keyword added last, or nullptr with the error set.
KvtNode* AddParam(KvtHandle file, KvtValueKind kind) {
    KvtTree* tree = BuildTree(file);
    if (tree == nullptr) return nullptr;
    if (tree->lastKeyword < 0) {
        KvtSetError(kKvtErrBuild);
        return nullptr;
    }
    KvtNode& p = tree->nodes[KvtAddNode(*tree, tree->lastKeyword, KvtNodeKind::Param, "")];
    p.valueKind = kind;
    KvtSetError(kKvtOk);
    return &p;
}

// A text must fit on one line of the file, and a null one is a caller's slip.
int AddText(KvtHandle file, KvtValueKind kind, const char* value) {
    if (BuildTree(file) == nullptr) return gKvtError;
    if (value == nullptr || std::strpbrk(value, "\r\n") != nullptr)
        return KvtSetError(kKvtErrBuild);
    KvtNode* p = AddParam(file, kind);
    if (p != nullptr) p->text = value;
    return gKvtError;
}

// ---- writing -----------------------------------------------------------------

// With shortest, the fewest digits that read back the same value (for
// messages); else a fixed count of digits.
void AppendReal(std::string& out, double value, bool single, bool shortest) {
    if (std::isnan(value)) {
        out += std::signbit(value) ? "-nan" : "nan";
        return;
    }
    if (std::isinf(value)) {
        out += value < 0 ? "-inf" : "inf";
        return;
    }
    char buf[48];
    const auto r =
        shortest ? (single ? std::to_chars(buf, buf + sizeof buf, static_cast<float>(value))
                           : std::to_chars(buf, buf + sizeof buf, value))
        : single ? std::to_chars(buf, buf + sizeof buf, static_cast<float>(value),
                                 std::chars_format::general, 9)
                 : std::to_chars(buf, buf + sizeof buf, value, std::chars_format::general, 17);
    const std::string text(buf, r.ptr);
    out += text;
    // "12" would load back as an integer.
    if (text.find_first_of(".e") == std::string::npos) out += ".0";
}

void AppendQuoted(std::string& out, const std::string& text) {
    out += '"';
    for (char c : text) {
        if (c == '"' || c == '\\') out += '\\';
        out += c;
    }
    out += '"';
}

void AppendParam(std::string& out, const KvtNode& p, bool shortest = false) {
    switch (p.valueKind) {
        case KvtValueKind::Integer:
            out += std::to_string(p.integer);
            break;
        case KvtValueKind::Real:
            AppendReal(out, p.real, p.single, shortest);
            break;
        case KvtValueKind::Logical:
            out += p.logical ? "true" : "false";
            break;
        case KvtValueKind::Text:
            AppendQuoted(out, p.text);
            break;
        case KvtValueKind::Filename:
            out += "file(";
            AppendQuoted(out, p.text);
            out += ')';
            break;
    }
}

// The text of the whole tree, walked with a stack of its own (trees nest to
// any depth). False if a keyword has no parameter: it would not load back.
bool TreeText(const KvtTree& tree, std::string& out) {
    struct Step {
        int node;
        size_t next;  // the child to write next
    };
    std::vector<Step> stack{{0, 0}};
    while (!stack.empty()) {
        Step& step = stack.back();
        const KvtNode& node = tree.nodes[step.node];
        const size_t depth = stack.size() - 1;  // of the node's children, in levels of indent
        if (step.next == node.children.size()) {
            stack.pop_back();
            if (!stack.empty()) out.append(4 * (depth - 1), ' ') += "}\n";
            continue;
        }
        const int childIndex = node.children[step.next++];
        const KvtNode& child = tree.nodes[childIndex];
        if (child.kind == KvtNodeKind::Target && step.next > 1) out += '\n';
        out.append(4 * depth, ' ') += child.name;
        if (child.kind == KvtNodeKind::Keyword) {
            if (child.children.empty()) return false;
            out += " = ";
            for (size_t i = 0; i < child.children.size(); ++i) {
                if (i > 0) out += ", ";
                AppendParam(out, tree.nodes[child.children[i]]);
            }
            out += '\n';
        } else {
            out += " {\n";
            stack.push_back({childIndex, 0});
        }
    }
    return true;
}

}  // namespace

KvtHandle kvtCreate(KvtHandle* file) {
    const KvtHandle handle = KvtMakeHandle(*KvtNewTree(nullptr), 0);
    if (file != nullptr) *file = handle;
    KvtSetError(kKvtOk);
    return handle;
}

int kvtAddTarget(KvtHandle file, const char* name) {
    return OpenBlock(file, name, true);
}

int kvtAddSection(KvtHandle file, const char* name) {
    return OpenBlock(file, name, false);
}

int kvtEndSection(KvtHandle file) {
    KvtTree* tree = BuildTree(file);
    if (tree == nullptr) return gKvtError;
    if (tree->openPath.empty()) return KvtSetError(kKvtErrBuild);
    tree->openPath.pop_back();
    tree->lastKeyword = -1;
    return KvtSetError(kKvtOk);
}

int kvtAddKeyword(KvtHandle file, const char* name) {
    KvtTree* tree = BuildTree(file);
    if (tree == nullptr) return gKvtError;
    if (!KvtValidName(name)) return KvtSetError(kKvtErrName);
    if (tree->openPath.empty()) return KvtSetError(kKvtErrBuild);
    tree->lastKeyword = KvtAddNode(*tree, tree->openPath.back(), KvtNodeKind::Keyword, name);
    return KvtSetError(kKvtOk);
}

int kvtAddInt(KvtHandle file, int32_t value) {
    if (KvtNode* p = AddParam(file, KvtValueKind::Integer)) p->integer = value;
    return gKvtError;
}

int kvtAddFloat(KvtHandle file, float value) {
    if (KvtNode* p = AddParam(file, KvtValueKind::Real)) {
        p->real = value;
        p->single = true;
    }
    return gKvtError;
}

int kvtAddDouble(KvtHandle file, double value) {
    if (KvtNode* p = AddParam(file, KvtValueKind::Real)) p->real = value;
    return gKvtError;
}

int kvtAddBool(KvtHandle file, bool value) {
    if (KvtNode* p = AddParam(file, KvtValueKind::Logical)) p->logical = value;
    return gKvtError;
}

int kvtAddString(KvtHandle file, const char* value) {
    return AddText(file, KvtValueKind::Text, value);
}

int kvtAddFilename(KvtHandle file, const char* value) {
    return AddText(file, KvtValueKind::Filename, value);
}

const char* kvtGetParamText(KvtHandle param) {
    int index = -1;
    KvtTree* tree = KvtFindTree(param, &index);
    if (tree == nullptr) return nullptr;
    KvtNode& p = tree->nodes[index];
    if (p.kind != KvtNodeKind::Param) {
        KvtSetError(kKvtErrHandle);
        return nullptr;
    }
    if (p.globalName.empty()) AppendParam(p.globalName, p, true);
    KvtSetError(kKvtOk);
    return p.globalName.c_str();
}

int kvtWrite(KvtHandle file, const char* path) {
    const KvtTree* tree = BuildTree(file);
    if (tree == nullptr) return gKvtError;
    std::string text;
    if (!TreeText(*tree, text)) return KvtSetError(kKvtErrBuild);
    if (path == nullptr) return KvtSetError(kKvtErrFile);
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out << text;
    out.close();
    return KvtSetError(out ? kKvtOk : kKvtErrFile);
}
