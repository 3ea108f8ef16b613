// The node store of the parameter library: the registry of open trees, the
// handles that point into them, the look-ups by name and instance, and the
// typed values of parameters.
//
// A handle is the serial number of its tree in the high 32 bits and the node's
// index + 1 in the low 32. Every call checks it against the registry, so a
// handle of a closed tree, or a number that was never a handle, gives
// kKvtErrHandle instead of a bad read. The registry is not locked: the library
// is used from one thread.
#include <cstring>
#include <filesystem>
#include <limits>
#include <memory>
#include <unordered_map>

#include "platform/kvt/kvt_internal.hpp"

namespace fs = std::filesystem;

int gKvtError = kKvtOk;

namespace {

// Children of a node are looked up through a name index once there are this many.
constexpr size_t kIndexFrom = 16;
constexpr size_t kMaxPath = 2047;

std::unordered_map<uint32_t, std::unique_ptr<KvtTree>> gTrees;
uint32_t gLastSerial = 0;

bool OneOf(KvtNodeKind kind, std::initializer_list<KvtNodeKind> kinds) {
    for (KvtNodeKind k : kinds)
        if (k == kind) return true;
    return false;
}

// The node of a handle if it is of one of the kinds asked, else nullptr with
// kKvtErrHandle set.
KvtNode* Node(KvtHandle handle, std::initializer_list<KvtNodeKind> kinds,
              KvtTree** treeOut = nullptr) {
    int index = -1;
    KvtTree* tree = KvtFindTree(handle, &index);
    if (tree == nullptr) return nullptr;
    KvtNode& node = tree->nodes[index];
    if (!OneOf(node.kind, kinds)) {
        KvtSetError(kKvtErrHandle);
        return nullptr;
    }
    if (treeOut != nullptr) *treeOut = tree;
    return &node;
}

KvtNode* Param(KvtHandle handle) {
    return Node(handle, {KvtNodeKind::Param});
}

void AddToIndex(KvtNameIndex& index, const KvtNode& child, int childIndex) {
    index[KvtIndexKey(child.kind, child.name)].push_back(childIndex);
}

void MakeIndex(KvtTree& tree, KvtNode& node) {
    node.index = std::make_unique<KvtNameIndex>();
    for (int child : node.children) AddToIndex(*node.index, tree.nodes[child], child);
}

// Keeps the name asked for in a node, once, for the report of what a run left unread.
void RecordAsked(KvtNode& node, KvtNodeKind kind, const char* name) {
    if (name[0] == '\0') return;
    if (node.asked == nullptr) node.asked = std::make_unique<KvtAsked>();
    std::string key = KvtIndexKey(kind, name);
    if (node.asked->known.insert(key).second) node.asked->names.push_back(std::move(key));
}

// A child by kind, name and instance. A look-up that reads (mark) records the
// name asked in the parent and marks the child it finds.
KvtHandle ChildByNameNum(KvtHandle parent, std::initializer_list<KvtNodeKind> parentKinds,
                         KvtNodeKind childKind, const char* name, int instance, bool mark = true) {
    KvtTree* tree = nullptr;
    KvtNode* node = Node(parent, parentKinds, &tree);
    if (node == nullptr) return 0;
    if (name == nullptr) {
        KvtSetError(kKvtErrNotFound);
        return 0;
    }
    if (mark) RecordAsked(*node, childKind, name);
    if (instance < 1) {
        KvtSetError(kKvtErrNotFound);
        return 0;
    }
    if (node->index == nullptr && node->children.size() >= kIndexFrom) MakeIndex(*tree, *node);
    int found = -1;
    if (node->index != nullptr) {
        const auto it = node->index->find(KvtIndexKey(childKind, name));
        if (it != node->index->end() && instance <= static_cast<int>(it->second.size()))
            found = it->second[instance - 1];
    } else {
        int seen = 0;
        for (int child : node->children) {
            const KvtNode& c = tree->nodes[child];
            if (c.kind == childKind && c.name == name && ++seen == instance) {
                found = child;
                break;
            }
        }
    }
    if (found < 0) {
        KvtSetError(kKvtErrNotFound);
        return 0;
    }
    if (mark) tree->nodes[found].read = true;
    KvtSetError(kKvtOk);
    return KvtMakeHandle(*tree, found);
}

bool IsKind(KvtHandle param, KvtValueKind kind) {
    const KvtNode* p = Param(param);
    if (p == nullptr) return false;
    KvtSetError(kKvtOk);
    return p->valueKind == kind;
}

}  // namespace

// ---- the registry and the nodes ---------------------------------------------

KvtTree* KvtNewTree(const char* path) {
    auto tree = std::make_unique<KvtTree>();
    // Serial 0 would make handles that can be mistaken for null ones.
    if (++gLastSerial == 0) ++gLastSerial;
    while (gTrees.count(gLastSerial) != 0) ++gLastSerial;
    tree->serial = gLastSerial;
    std::error_code ec;
    fs::path folder = (path != nullptr && path[0] != '\0') ? fs::path(path).parent_path() : "";
    if (folder.empty()) folder = ".";
    const fs::path absolute = fs::absolute(folder, ec);
    tree->folder = ec ? folder.string() : absolute.lexically_normal().string();
    tree->nodes.emplace_back();  // the file
    KvtTree* raw = tree.get();
    gTrees[raw->serial] = std::move(tree);
    return raw;
}

KvtTree* KvtFindTree(KvtHandle handle, int* node) {
    const uint32_t serial = static_cast<uint32_t>(handle >> 32);
    const uint32_t index = static_cast<uint32_t>(handle & 0xffffffffu);
    const auto it = gTrees.find(serial);
    if (index == 0 || it == gTrees.end() || index > it->second->nodes.size()) {
        KvtSetError(kKvtErrHandle);
        return nullptr;
    }
    *node = static_cast<int>(index) - 1;
    return it->second.get();
}

KvtHandle KvtMakeHandle(const KvtTree& tree, int node) {
    return (static_cast<KvtHandle>(tree.serial) << 32) | static_cast<KvtHandle>(node + 1);
}

int KvtAddNode(KvtTree& tree, int parent, KvtNodeKind kind, const std::string& name) {
    const int index = static_cast<int>(tree.nodes.size());
    KvtNode& node = tree.nodes.emplace_back();
    node.kind = kind;
    node.parent = parent;
    node.name = name;
    KvtNode& p = tree.nodes[parent];
    if (p.kind == KvtNodeKind::File)
        node.level = 0;
    else
        node.level = kind == KvtNodeKind::Section ? p.level + 1 : p.level;
    p.children.push_back(index);
    if (p.index != nullptr) AddToIndex(*p.index, node, index);
    return index;
}

void KvtDropLastNode(KvtTree& tree) {
    const int index = static_cast<int>(tree.nodes.size()) - 1;
    KvtNode& p = tree.nodes[tree.nodes.back().parent];
    if (p.index != nullptr) {
        const auto it = p.index->find(KvtIndexKey(tree.nodes.back().kind, tree.nodes.back().name));
        it->second.pop_back();
        if (it->second.empty()) p.index->erase(it);
    }
    p.children.pop_back();
    if (tree.lastKeyword == index) tree.lastKeyword = -1;
    tree.nodes.pop_back();
}

std::string KvtIndexKey(KvtNodeKind kind, const std::string& name) {
    return static_cast<char>('0' + static_cast<int>(kind)) + name;
}

const std::vector<int>& KvtInstances(KvtTree& tree, int parent, KvtNodeKind kind,
                                     const std::string& name) {
    static const std::vector<int> kNone;
    KvtNode& node = tree.nodes[parent];
    if (node.index == nullptr) MakeIndex(tree, node);
    const auto it = node.index->find(KvtIndexKey(kind, name));
    return it != node.index->end() ? it->second : kNone;
}

bool KvtValidName(const char* name) {
    auto letter = [](char c) {
        return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_';
    };
    if (name == nullptr || !letter(name[0])) return false;
    for (const char* c = name; *c != '\0'; ++c)
        if (!letter(*c) && !(*c >= '0' && *c <= '9')) return false;
    return true;
}

// ---- reading ----------------------------------------------------------------

int kvtPeekErrorGlb() {
    return gKvtError;
}

void kvtGetSyntaxErr(KvtHandle file, int* line, int* column, const char** text) {
    int index = -1;
    const KvtTree* tree = KvtFindTree(file, &index);
    if (line != nullptr) *line = tree != nullptr ? tree->errorLine : 0;
    if (column != nullptr) *column = tree != nullptr ? tree->errorColumn : 0;
    if (text != nullptr) *text = tree != nullptr ? tree->errorText.c_str() : "";
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

KvtHandle kvtKeywordPeek(KvtHandle section, const char* name, int instance) {
    return ChildByNameNum(section, {KvtNodeKind::Target, KvtNodeKind::Section},
                          KvtNodeKind::Keyword, name, instance, false);
}

KvtHandle kvtChildByNum(KvtHandle node, int number) {
    KvtTree* tree = nullptr;
    const KvtNode* n = Node(
        node, {KvtNodeKind::File, KvtNodeKind::Target, KvtNodeKind::Section, KvtNodeKind::Keyword},
        &tree);
    if (n == nullptr) return 0;
    if (number < 1 || number > static_cast<int>(n->children.size())) {
        KvtSetError(kKvtErrNotFound);
        return 0;
    }
    KvtSetError(kKvtOk);
    return KvtMakeHandle(*tree, n->children[number - 1]);
}

KvtHandle kvtParamByNum(KvtHandle keyword, int number) {
    if (Node(keyword, {KvtNodeKind::Keyword}) == nullptr) return 0;
    return kvtChildByNum(keyword, number);
}

int kvtParamCount(KvtHandle keyword) {
    const KvtNode* k = Node(keyword, {KvtNodeKind::Keyword});
    if (k == nullptr) return 0;
    KvtSetError(kKvtOk);
    return static_cast<int>(k->children.size());
}

bool kvtIsKeyword(KvtHandle node) {
    int index = -1;
    const KvtTree* tree = KvtFindTree(node, &index);
    if (tree == nullptr) return false;
    KvtSetError(kKvtOk);
    return tree->nodes[index].kind == KvtNodeKind::Keyword;
}

namespace {

// A target, section or keyword, with the error code cleared; nullptr (and
// the code of Node) for any other handle.
const KvtNode* NamedNode(KvtHandle node) {
    const KvtNode* n =
        Node(node, {KvtNodeKind::Target, KvtNodeKind::Section, KvtNodeKind::Keyword});
    if (n != nullptr) KvtSetError(kKvtOk);
    return n;
}

}  // namespace

int kvtGetLevel(KvtHandle node) {
    const KvtNode* n = NamedNode(node);
    return n != nullptr ? n->level : 0;
}

int kvtGetLine(KvtHandle node) {
    const KvtNode* n = NamedNode(node);
    return n != nullptr ? n->line : 0;
}

bool kvtIsRead(KvtHandle node) {
    const KvtNode* n = NamedNode(node);
    return n != nullptr && n->read;
}

const char* kvtGetAskedName(KvtHandle node, int number, bool* keyword) {
    const KvtNode* n = Node(node, {KvtNodeKind::File, KvtNodeKind::Target, KvtNodeKind::Section});
    if (n == nullptr) return nullptr;
    if (n->asked == nullptr || number < 1 || number > static_cast<int>(n->asked->names.size())) {
        KvtSetError(kKvtErrNotFound);
        return nullptr;
    }
    const std::string& key = n->asked->names[number - 1];
    if (keyword != nullptr)
        *keyword = key[0] == static_cast<char>('0' + static_cast<int>(KvtNodeKind::Keyword));
    KvtSetError(kKvtOk);
    return key.c_str() + 1;
}

const char* kvtGetNameGlb(KvtHandle node) {
    KvtTree* tree = nullptr;
    KvtNode* n =
        Node(node, {KvtNodeKind::Target, KvtNodeKind::Section, KvtNodeKind::Keyword}, &tree);
    if (n == nullptr) return nullptr;
    if (n->globalName.empty()) {
        // Only the node asked keeps its path: keeping the paths of all its
        // ancestors as well would cost memory of the square of the depth.
        std::vector<const std::string*> names;
        for (const KvtNode* a = n;; a = &tree->nodes[a->parent]) {
            names.push_back(&a->name);
            if (a->kind == KvtNodeKind::Target) break;
        }
        size_t length = names.size() - 1;
        for (const std::string* s : names) length += s->size();
        n->globalName.reserve(length);
        for (auto it = names.rbegin(); it != names.rend(); ++it) {
            if (it != names.rbegin()) n->globalName += '.';
            n->globalName += **it;
        }
    }
    KvtSetError(kKvtOk);
    return n->globalName.c_str();
}

const char* kvtGetName(KvtHandle node) {
    const KvtNode* n =
        Node(node, {KvtNodeKind::Target, KvtNodeKind::Section, KvtNodeKind::Keyword});
    if (n == nullptr) return nullptr;
    KvtSetError(kKvtOk);
    return n->name.c_str();
}

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
    if (p->valueKind != KvtValueKind::Integer) return KvtSetError(kKvtErrKind), 0;
    if (p->integer < std::numeric_limits<int32_t>::min() ||
        p->integer > std::numeric_limits<int32_t>::max())
        return KvtSetError(kKvtErrRange), 0;
    KvtSetError(kKvtOk);
    return static_cast<int32_t>(p->integer);
}

double kvtGetDouble(KvtHandle param) {
    const KvtNode* p = Param(param);
    if (p == nullptr) return 0.0;
    if (p->valueKind == KvtValueKind::Real) return KvtSetError(kKvtOk), p->real;
    if (p->valueKind == KvtValueKind::Integer)
        return KvtSetError(kKvtOk), static_cast<double>(p->integer);
    KvtSetError(kKvtErrKind);
    return 0.0;
}

// An integer is rounded to 32 bits at once: through a double it would be
// rounded twice.
float kvtGetFloat(KvtHandle param) {
    const KvtNode* p = Param(param);
    if (p != nullptr && p->valueKind == KvtValueKind::Integer)
        return KvtSetError(kKvtOk), static_cast<float>(p->integer);
    return static_cast<float>(kvtGetDouble(param));
}

bool kvtGetBool(KvtHandle param) {
    const KvtNode* p = Param(param);
    if (p == nullptr) return false;
    if (p->valueKind != KvtValueKind::Logical) return KvtSetError(kKvtErrKind), false;
    KvtSetError(kKvtOk);
    return p->logical;
}

const char* kvtGetString(KvtHandle param) {
    const KvtNode* p = Param(param);
    if (p == nullptr) return nullptr;
    if (p->valueKind != KvtValueKind::Text) return KvtSetError(kKvtErrKind), nullptr;
    KvtSetError(kKvtOk);
    return p->text.c_str();
}

// A text may stand for a file name: the files the model writes for itself
// keep their paths as texts.
const char* kvtGetFilename(KvtHandle param) {
    const KvtNode* p = Param(param);
    if (p == nullptr) return nullptr;
    if (p->valueKind != KvtValueKind::Filename && p->valueKind != KvtValueKind::Text)
        return KvtSetError(kKvtErrKind), nullptr;
    KvtSetError(kKvtOk);
    return p->text.c_str();
}

const char* kvtGetResultFilenamePath(KvtHandle param) {
    KvtTree* tree = nullptr;
    KvtNode* p = Node(param, {KvtNodeKind::Param}, &tree);
    if (p == nullptr) return nullptr;
    if (kvtGetFilename(param) == nullptr) return nullptr;
    if (p->resolved.empty()) {
        fs::path path(p->text);
        if (path.is_relative()) path = fs::path(tree->folder) / path;
        p->resolved = path.lexically_normal().string();
    }
    // A cut path would name another file.
    if (p->resolved.size() > kMaxPath) return KvtSetError(kKvtErrRange), nullptr;
    KvtSetError(kKvtOk);
    return p->resolved.c_str();
}

void kvtClose(KvtHandle* file) {
    if (file == nullptr) {
        KvtSetError(kKvtErrHandle);
        return;
    }
    int index = -1;
    const KvtTree* tree = KvtFindTree(*file, &index);
    if (tree == nullptr) return;
    if (index != 0) {
        KvtSetError(kKvtErrHandle);
        return;
    }
    gTrees.erase(tree->serial);
    *file = 0;
    KvtSetError(kKvtOk);
}
