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
#include <vector>

#include "platform/kvt/kvt.hpp"

enum class KvtNodeKind : uint8_t { File, Target, Section, Keyword, Param };
enum class KvtValueKind : uint8_t { Integer, Real, Logical, Text, Filename };

// Children of one node by kind and name, each list in file order, so that an
// instance is found in constant time. Built on the first look-up in a node
// with many children and kept up to date as children are added.
using KvtNameIndex = std::unordered_map<std::string, std::vector<int>>;

struct KvtNode {
    KvtNodeKind kind = KvtNodeKind::File;
    int parent = -1;
    int level = 0;              // targets 0, their sections 1, ...; keywords as their section
    std::string name;           // targets, sections and keywords
    std::vector<int> children;  // in file order
    std::unique_ptr<KvtNameIndex> index;
    // Parameters.
    KvtValueKind valueKind = KvtValueKind::Integer;
    bool single = false;  // a real added as 32-bit: written with 9 digits
    int64_t integer = 0;
    double real = 0.0;
    bool logical = false;
    std::string text;  // texts and file names as written
    // Made on the first call that asks for them, then never changed.
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
// Parses text into an empty tree. On a syntax error fills the error fields and
// returns false, keeping what was read before it.
bool KvtParse(KvtTree& tree, const char* text, size_t length);
