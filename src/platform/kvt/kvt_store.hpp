// The record behind the parameter library's handles: every tree is a flat
// array of nodes, each knowing its parent and children, in file order.
#pragma once

#include <cstdint>
#include <string>
#include <unordered_map>
#include <vector>

#include "platform/kvt/kvt.hpp"

enum class KvtNodeKind : uint8_t { File, Target, Section, Keyword, Param };
enum class KvtValueKind : uint8_t { Integer, Real, Logical, Text, Filename };

struct KvtNode {
    KvtNodeKind kind = KvtNodeKind::File;
    int parent = -1;
    int level = 0;
    std::string name;           // targets, sections and keywords
    std::vector<int> children;  // in file order
    // Parameters.
    KvtValueKind valueKind = KvtValueKind::Integer;
    bool single = false;  // a real added as 32-bit, written with 9 digits
    int64_t integer = 0;
    double real = 0.0;
    bool logical = false;
    std::string text;  // texts and file names as written
    // Filled on demand: the path of names and the resolved file path.
    std::string globalName;
    std::string resolved;
};

struct KvtTree {
    uint32_t serial = 0;
    std::string folder;          // the folder of the file, for relative file names
    std::vector<KvtNode> nodes;  // node 0 is the file
    std::vector<int> openPath;   // building: the open target and sections
    int lastKeyword = -1;        // building: the keyword that takes parameters
    // Syntax error of the load, if any.
    int errorLine = 0;
    int errorColumn = 0;
    std::string errorText;
};

// The library's global error code.
extern int gKvtError;

KvtTree* KvtNewTree(const std::string& path);
// The tree and node of a handle, or nullptr (with kKvtErrHandle set).
KvtTree* KvtFindTree(KvtHandle handle, int* node);
KvtHandle KvtMakeHandle(const KvtTree& tree, int node);
int KvtAddNode(KvtTree& tree, int parent, KvtNodeKind kind, const std::string& name);
bool KvtValidName(const std::string& name);
// Parses text into an empty tree; on a syntax error fills the error fields
// and returns false, keeping what was read before it.
bool KvtParse(KvtTree& tree, const char* text, size_t length);
