// The writer of parameter files: the loader's syntax, four blanks of
// indentation a level, reals with enough digits to load back bit for bit.
#include <cmath>
#include <cstdio>
#include <fstream>
#include <string>

#include "platform/kvt/kvt_store.hpp"

namespace {

std::string RealText(double value, bool single) {
    if (std::isnan(value)) return "nan";
    if (std::isinf(value)) return value < 0 ? "-inf" : "inf";
    char buf[40];
    if (single)
        std::snprintf(buf, sizeof buf, "%.9g", static_cast<double>(static_cast<float>(value)));
    else
        std::snprintf(buf, sizeof buf, "%.17g", value);
    std::string text(buf);
    if (text.find_first_of(".eE") == std::string::npos)
        text += ".0";  // stays a real when read back
    return text;
}

std::string Quoted(const std::string& text) {
    std::string out = "\"";
    for (char c : text) {
        if (c == '"' || c == '\\') out += '\\';
        out += c;
    }
    return out + "\"";
}

std::string ParamText(const KvtNode& p) {
    switch (p.valueKind) {
        case KvtValueKind::Integer:
            return std::to_string(p.integer);
        case KvtValueKind::Real:
            return RealText(p.real, p.single);
        case KvtValueKind::Logical:
            return p.logical ? "true" : "false";
        case KvtValueKind::Text:
            return Quoted(p.text);
        case KvtValueKind::Filename:
            return "file(" + Quoted(p.text) + ")";
    }
    return "";
}

void WriteNode(const KvtTree& tree, int index, int depth, std::string& out) {
    const KvtNode& node = tree.nodes[index];
    const std::string indent(4 * static_cast<size_t>(depth), ' ');
    if (node.kind == KvtNodeKind::Keyword) {
        out += indent + node.name + " =";
        for (size_t i = 0; i < node.children.size(); ++i)
            out += (i == 0 ? " " : ", ") + ParamText(tree.nodes[node.children[i]]);
        out += "\n";
        return;
    }
    out += indent + node.name + " {\n";
    for (int child : node.children) WriteNode(tree, child, depth + 1, out);
    out += indent + "}\n";
}

}  // namespace

int kvtWrite(KvtHandle file, const char* path) {
    int index = -1;
    KvtTree* tree = KvtFindTree(file, &index);
    if (tree == nullptr) return gKvtError;
    if (index != 0) return gKvtError = kKvtErrHandle;
    std::string out;
    const std::vector<int>& targets = tree->nodes[0].children;
    for (size_t i = 0; i < targets.size(); ++i) {
        if (i > 0) out += "\n";
        WriteNode(*tree, targets[i], 0, out);
    }
    std::ofstream stream(path, std::ios::binary | std::ios::trunc);
    stream << out;
    stream.close();
    return gKvtError = stream ? kKvtOk : kKvtErrFile;
}
