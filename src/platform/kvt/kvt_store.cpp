// Trees, handles, look-ups and values of the parameter library.
#include "platform/kvt/kvt_store.hpp"

#include <cmath>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <limits>
#include <memory>
#include <sstream>

namespace fs = std::filesystem;

int gKvtError = kKvtOk;

namespace {

std::unordered_map<uint32_t, std::unique_ptr<KvtTree>> gTrees;
uint32_t gNextSerial = 1;

int SetError(int code) {
    gKvtError = code;
    return code;
}

// The node of a handle if it is of one of the kinds asked, else nullptr.
KvtNode* Node(KvtHandle handle, std::initializer_list<KvtNodeKind> kinds,
              KvtTree** treeOut = nullptr) {
    int index = -1;
    KvtTree* tree = KvtFindTree(handle, &index);
    if (tree == nullptr) return nullptr;
    KvtNode& node = tree->nodes[index];
    for (KvtNodeKind k : kinds) {
        if (node.kind == k) {
            if (treeOut != nullptr) *treeOut = tree;
            return &node;
        }
    }
    SetError(kKvtErrHandle);
    return nullptr;
}

KvtHandle ChildByNameNum(KvtHandle parent, std::initializer_list<KvtNodeKind> parentKinds,
                         KvtNodeKind childKind, const char* name, int instance) {
    KvtTree* tree = nullptr;
    KvtNode* node = Node(parent, parentKinds, &tree);
    if (node == nullptr || name == nullptr) return 0;
    int seen = 0;
    for (int child : node->children) {
        const KvtNode& c = tree->nodes[child];
        if (c.kind == childKind && c.name == name && ++seen == instance) {
            SetError(kKvtOk);
            return KvtMakeHandle(*tree, child);
        }
    }
    SetError(kKvtErrNotFound);
    return 0;
}

KvtNode* Param(KvtHandle handle) {
    return Node(handle, {KvtNodeKind::Param});
}

// Building: the tree of a handle that must be a file handle.
KvtTree* BuildTree(KvtHandle file) {
    KvtTree* tree = nullptr;
    if (Node(file, {KvtNodeKind::File}, &tree) == nullptr) return nullptr;
    return tree;
}

int AddParam(KvtHandle file, KvtValueKind kind, auto fill) {
    KvtTree* tree = BuildTree(file);
    if (tree == nullptr) return gKvtError;
    if (tree->lastKeyword < 0) return SetError(kKvtErrBuild);
    const int p = KvtAddNode(*tree, tree->lastKeyword, KvtNodeKind::Param, "");
    tree->nodes[p].valueKind = kind;
    fill(tree->nodes[p]);
    return SetError(kKvtOk);
}

}  // namespace

KvtTree* KvtNewTree(const std::string& path) {
    auto tree = std::make_unique<KvtTree>();
    tree->serial = gNextSerial++;
    if (!path.empty()) {
        fs::path folder = fs::path(path).parent_path();
        std::error_code ec;
        tree->folder =
            fs::absolute(folder.empty() ? fs::path(".") : folder, ec).lexically_normal().string();
    }
    tree->nodes.emplace_back();  // the file
    KvtTree* raw = tree.get();
    gTrees[raw->serial] = std::move(tree);
    return raw;
}

KvtTree* KvtFindTree(KvtHandle handle, int* node) {
    const uint32_t serial = static_cast<uint32_t>(handle >> 32);
    const uint32_t index = static_cast<uint32_t>(handle & 0xffffffffu);
    auto it = gTrees.find(serial);
    if (handle == 0 || it == gTrees.end() || index == 0 || index > it->second->nodes.size()) {
        SetError(kKvtErrHandle);
        return nullptr;
    }
    *node = static_cast<int>(index) - 1;
    return it->second.get();
}

KvtHandle KvtMakeHandle(const KvtTree& tree, int node) {
    return (static_cast<KvtHandle>(tree.serial) << 32) | static_cast<KvtHandle>(node + 1);
}

int KvtAddNode(KvtTree& tree, int parent, KvtNodeKind kind, const std::string& name) {
    KvtNode node;
    node.kind = kind;
    node.parent = parent;
    node.name = name;
    const KvtNode& p = tree.nodes[parent];
    node.level = (p.kind == KvtNodeKind::File)    ? 0
                 : (kind == KvtNodeKind::Section) ? p.level + 1
                                                  : p.level;
    tree.nodes.push_back(std::move(node));
    const int index = static_cast<int>(tree.nodes.size()) - 1;
    tree.nodes[parent].children.push_back(index);
    return index;
}

bool KvtValidName(const std::string& name) {
    if (name.empty()) return false;
    auto letter = [](char c) {
        return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_';
    };
    if (!letter(name[0])) return false;
    for (char c : name)
        if (!letter(c) && !(c >= '0' && c <= '9')) return false;
    return true;
}

// ---- reading ---------------------------------------------------------------

KvtHandle kvtLoadText(const char* text, uint64_t length, const char* path, KvtHandle* file) {
    KvtTree* tree = KvtNewTree(path != nullptr ? path : "");
    const KvtHandle handle = KvtMakeHandle(*tree, 0);
    if (file != nullptr) *file = handle;
    SetError(KvtParse(*tree, text, static_cast<size_t>(length)) ? kKvtOk : kKvtErrSyntax);
    return handle;
}

KvtHandle kvtLoadFile(const char* path, int /*option*/, KvtHandle* file) {
    if (file != nullptr) *file = 0;
    std::error_code ec;
    if (path == nullptr || !fs::is_regular_file(path, ec)) {
        SetError(kKvtErrFile);
        return 0;
    }
    std::ifstream in(path, std::ios::binary);
    if (!in) {
        SetError(kKvtErrFile);
        return 0;
    }
    std::stringstream buffer;
    buffer << in.rdbuf();
    const std::string text = buffer.str();
    return kvtLoadText(text.data(), text.size(), path, file);
}

int kvtPeekErrorGlb() {
    return gKvtError;
}

void kvtGetSyntaxErr(KvtHandle file, int* line, int* column, const char** text) {
    int index = -1;
    KvtTree* tree = KvtFindTree(file, &index);
    if (line != nullptr) *line = tree ? tree->errorLine : 0;
    if (column != nullptr) *column = tree ? tree->errorColumn : 0;
    if (text != nullptr) *text = tree ? tree->errorText.c_str() : "";
}

KvtHandle kvtTargetByNameNum(KvtHandle file, const char* name, int instance) {
    return ChildByNameNum(file, {KvtNodeKind::File}, KvtNodeKind::Target, name, instance);
}

KvtHandle kvtSectionByNameNum(KvtHandle parent, const char* name, int instance) {
    return ChildByNameNum(parent, {KvtNodeKind::Target, KvtNodeKind::Section}, KvtNodeKind::Section,
                          name, instance);
}

KvtHandle kvtKeywordByNameNum(KvtHandle section, const char* name, int instance) {
    return ChildByNameNum(section, {KvtNodeKind::Target, KvtNodeKind::Section},
                          KvtNodeKind::Keyword, name, instance);
}

KvtHandle kvtParamByNum(KvtHandle keyword, int number) {
    KvtTree* tree = nullptr;
    KvtNode* node = Node(keyword, {KvtNodeKind::Keyword}, &tree);
    if (node == nullptr) return 0;
    if (number < 1 || number > static_cast<int>(node->children.size())) {
        SetError(kKvtErrNotFound);
        return 0;
    }
    SetError(kKvtOk);
    return KvtMakeHandle(*tree, node->children[number - 1]);
}

int kvtGetLevel(KvtHandle node) {
    KvtNode* n = Node(node, {KvtNodeKind::Target, KvtNodeKind::Section, KvtNodeKind::Keyword});
    if (n == nullptr) return 0;
    SetError(kKvtOk);
    return n->level;
}

const char* kvtGetNameGlb(KvtHandle node) {
    KvtTree* tree = nullptr;
    KvtNode* n =
        Node(node, {KvtNodeKind::Target, KvtNodeKind::Section, KvtNodeKind::Keyword}, &tree);
    if (n == nullptr) return nullptr;
    std::string path = n->name;
    for (int p = n->parent; p > 0; p = tree->nodes[p].parent)
        path = tree->nodes[p].name + "." + path;
    n->globalName = path;
    SetError(kKvtOk);
    return n->globalName.c_str();
}

const char* kvtGetName(KvtHandle node) {
    KvtNode* n = Node(node, {KvtNodeKind::Target, KvtNodeKind::Section, KvtNodeKind::Keyword});
    if (n == nullptr) return nullptr;
    SetError(kKvtOk);
    return n->name.c_str();
}

namespace {
bool IsKind(KvtHandle param, KvtValueKind kind) {
    const KvtNode* p = Param(param);
    return p != nullptr && p->valueKind == kind;
}
}  // namespace

bool kvtIsInt(KvtHandle param) {
    return IsKind(param, KvtValueKind::Integer);
}
bool kvtIsReal(KvtHandle param) {
    return IsKind(param, KvtValueKind::Real);
}
bool kvtIsBool(KvtHandle param) {
    return IsKind(param, KvtValueKind::Logical);
}
bool kvtIsString(KvtHandle param) {
    return IsKind(param, KvtValueKind::Text);
}
bool kvtIsFilename(KvtHandle param) {
    return IsKind(param, KvtValueKind::Filename);
}

int32_t kvtGetInt(KvtHandle param) {
    const KvtNode* p = Param(param);
    if (p == nullptr) return 0;
    if (p->valueKind != KvtValueKind::Integer) return SetError(kKvtErrKind), 0;
    if (p->integer < std::numeric_limits<int32_t>::min() ||
        p->integer > std::numeric_limits<int32_t>::max())
        return SetError(kKvtErrRange), 0;
    SetError(kKvtOk);
    return static_cast<int32_t>(p->integer);
}

double kvtGetDouble(KvtHandle param) {
    const KvtNode* p = Param(param);
    if (p == nullptr) return 0.0;
    if (p->valueKind == KvtValueKind::Real) return SetError(kKvtOk), p->real;
    if (p->valueKind == KvtValueKind::Integer)
        return SetError(kKvtOk), static_cast<double>(p->integer);
    SetError(kKvtErrKind);
    return 0.0;
}

float kvtGetFloat(KvtHandle param) {
    return static_cast<float>(kvtGetDouble(param));
}

bool kvtGetBool(KvtHandle param) {
    const KvtNode* p = Param(param);
    if (p == nullptr) return false;
    if (p->valueKind != KvtValueKind::Logical) return SetError(kKvtErrKind), false;
    SetError(kKvtOk);
    return p->logical;
}

const char* kvtGetString(KvtHandle param) {
    const KvtNode* p = Param(param);
    if (p == nullptr) return nullptr;
    if (p->valueKind != KvtValueKind::Text) return SetError(kKvtErrKind), nullptr;
    SetError(kKvtOk);
    return p->text.c_str();
}

const char* kvtGetFilename(KvtHandle param) {
    const KvtNode* p = Param(param);
    if (p == nullptr) return nullptr;
    if (p->valueKind != KvtValueKind::Filename && p->valueKind != KvtValueKind::Text)
        return SetError(kKvtErrKind), nullptr;
    SetError(kKvtOk);
    return p->text.c_str();
}

const char* kvtGetResultFilenamePath(KvtHandle param) {
    KvtTree* tree = nullptr;
    int index = -1;
    const char* name = kvtGetFilename(param);
    if (name == nullptr || (tree = KvtFindTree(param, &index)) == nullptr) return nullptr;
    KvtNode& p = tree->nodes[index];
    fs::path path(name);
    if (path.is_relative() && !tree->folder.empty()) path = fs::path(tree->folder) / path;
    p.resolved = path.lexically_normal().string();
    if (p.resolved.size() > 2047) p.resolved.resize(2047);
    SetError(kKvtOk);
    return p.resolved.c_str();
}

void kvtClose(KvtHandle* file) {
    if (file == nullptr) return;
    int index = -1;
    KvtTree* tree = KvtFindTree(*file, &index);
    if (tree != nullptr) gTrees.erase(tree->serial);
    *file = 0;
}

// ---- building ---------------------------------------------------------------

KvtHandle kvtCreate(KvtHandle* file) {
    KvtTree* tree = KvtNewTree("");
    const KvtHandle handle = KvtMakeHandle(*tree, 0);
    if (file != nullptr) *file = handle;
    SetError(kKvtOk);
    return handle;
}

int kvtAddTarget(KvtHandle file, const char* name) {
    KvtTree* tree = BuildTree(file);
    if (tree == nullptr) return gKvtError;
    if (name == nullptr || !KvtValidName(name)) return SetError(kKvtErrName);
    if (!tree->openPath.empty()) return SetError(kKvtErrBuild);
    tree->openPath.push_back(KvtAddNode(*tree, 0, KvtNodeKind::Target, name));
    tree->lastKeyword = -1;
    return SetError(kKvtOk);
}

int kvtAddSection(KvtHandle file, const char* name) {
    KvtTree* tree = BuildTree(file);
    if (tree == nullptr) return gKvtError;
    if (name == nullptr || !KvtValidName(name)) return SetError(kKvtErrName);
    if (tree->openPath.empty()) return SetError(kKvtErrBuild);
    tree->openPath.push_back(KvtAddNode(*tree, tree->openPath.back(), KvtNodeKind::Section, name));
    tree->lastKeyword = -1;
    return SetError(kKvtOk);
}

int kvtEndSection(KvtHandle file) {
    KvtTree* tree = BuildTree(file);
    if (tree == nullptr) return gKvtError;
    if (tree->openPath.empty()) return SetError(kKvtErrBuild);
    tree->openPath.pop_back();
    tree->lastKeyword = -1;
    return SetError(kKvtOk);
}

int kvtAddKeyword(KvtHandle file, const char* name) {
    KvtTree* tree = BuildTree(file);
    if (tree == nullptr) return gKvtError;
    if (name == nullptr || !KvtValidName(name)) return SetError(kKvtErrName);
    if (tree->openPath.empty()) return SetError(kKvtErrBuild);
    tree->lastKeyword = KvtAddNode(*tree, tree->openPath.back(), KvtNodeKind::Keyword, name);
    return SetError(kKvtOk);
}

int kvtAddInt(KvtHandle file, int32_t value) {
    return AddParam(file, KvtValueKind::Integer, [&](KvtNode& p) { p.integer = value; });
}
int kvtAddFloat(KvtHandle file, float value) {
    return AddParam(file, KvtValueKind::Real, [&](KvtNode& p) {
        p.real = value;
        p.single = true;
    });
}
int kvtAddDouble(KvtHandle file, double value) {
    return AddParam(file, KvtValueKind::Real, [&](KvtNode& p) { p.real = value; });
}
int kvtAddBool(KvtHandle file, bool value) {
    return AddParam(file, KvtValueKind::Logical, [&](KvtNode& p) { p.logical = value; });
}
int kvtAddString(KvtHandle file, const char* value) {
    // A text stands on one line of the file: line breaks can't be written.
    if (value != nullptr && std::strpbrk(value, "\r\n") != nullptr) return SetError(kKvtErrBuild);
    return AddParam(file, KvtValueKind::Text, [&](KvtNode& p) { p.text = value ? value : ""; });
}
int kvtAddFilename(KvtHandle file, const char* value) {
    if (value != nullptr && std::strpbrk(value, "\r\n") != nullptr) return SetError(kKvtErrBuild);
    return AddParam(file, KvtValueKind::Filename, [&](KvtNode& p) { p.text = value ? value : ""; });
}
