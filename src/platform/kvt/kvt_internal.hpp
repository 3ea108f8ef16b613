// The record behind the parameter library's handles, shared by the node store,
// the loader and the writer. Every tree is a flat list of nodes, each knowing
// its parent and its children in file order. The list is a deque so that a
// node never moves: texts handed out by the library stay valid while the tree
// grows, until kvtClose.
#pragma once

#include <cstdint>
#include <deque>
#include <memory>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "platform/kvt/kvt.hpp"

enum class KvtNodeKind : uint8_t { File, Target, Section, Keyword, Param };
enum class KvtValueKind : uint8_t { Integer, Real, Logical, Text, Filename };

// Children of one node by kind and name, each list in file order, so that an
// instance is found in constant time. Built on the first look-up in a node
// with many children and kept up to date as children are added.
using KvtNameIndex = std::unordered_map<std::string, std::vector<int>>;

// The names looked up in a file, target or section, each once, in the order
// first asked: the kind's digit and the name, as the keys of the name index.
// A deque, so that the names handed out stay where they are.
struct KvtAsked {
    std::deque<std::string> names;
    std::unordered_set<std::string> known;
};

struct KvtNode {
    KvtNodeKind kind = KvtNodeKind::File;
    int parent = -1;
    int level = 0;              // targets 0, their sections 1, ...; keywords as their section
    std::string name;           // targets, sections and keywords
    std::vector<int> children;  // in file order
    std::unique_ptr<KvtNameIndex> index;
    int line = 0;       // of the name in the loaded file, from 1; 0 when built in memory
    bool read = false;  // found by a look-up by name
    std::unique_ptr<KvtAsked> asked;
    // Parameters.
    KvtValueKind valueKind = KvtValueKind::Integer;
    bool single = false;  // a real added as 32-bit: written with 9 digits
    int64_t integer = 0;
    double real = 0.0;
    bool logical = false;
    std::string text;  // texts and file names as written
    // Made on the first call that asks for them, then never changed. A
    // parameter keeps its text as written in globalName.
    std::string globalName;
    std::string resolved;
};

struct KvtTree {
    uint32_t serial = 0;
    std::string folder;         // absolute folder that relative file names are taken from
    std::deque<KvtNode> nodes;  // node 0 is the file
    std::vector<int> openPath;  // building: the open target and sections
    int lastKeyword = -1;       // building: the keyword that takes parameters
    // The first syntax error of the load, if any.
    int errorLine = 0;
    int errorColumn = 0;
    std::string errorText;
};

// The library's global error code: the outcome of the last call.
extern int gKvtError;

inline int KvtSetError(int code) {
    gKvtError = code;
    return code;
}

// A new empty tree in the registry; path is the parameter file (may be empty).
KvtTree* KvtNewTree(const char* path);
// The tree and node of a handle, or nullptr with kKvtErrHandle set.
KvtTree* KvtFindTree(KvtHandle handle, int* node);
KvtHandle KvtMakeHandle(const KvtTree& tree, int node);
// Appends a child to parent and returns its index.
int KvtAddNode(KvtTree& tree, int parent, KvtNodeKind kind, const std::string& name);
// Removes the node added last (a keyword left without parameters by a syntax error).
void KvtDropLastNode(KvtTree& tree);
bool KvtValidName(const char* name);
// The key of a child in its parent's name index and list of asked names.
std::string KvtIndexKey(KvtNodeKind kind, const std::string& name);
// The children of parent of that kind and name, in file order (the parent's
// name index is made if it has none yet).
const std::vector<int>& KvtInstances(KvtTree& tree, int parent, KvtNodeKind kind,
                                     const std::string& name);
// Parses text into an empty tree. On a syntax error fills the error fields and
// returns false, keeping what was read before it.
bool KvtParse(KvtTree& tree, const char* text, size_t length);
