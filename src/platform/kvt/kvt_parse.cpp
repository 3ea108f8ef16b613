// The loader of parameter files: a hand-written recursive reader that builds
// the tree and stops at the first syntax error with its line and column.
#include <cctype>
#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "platform/kvt/kvt_store.hpp"

namespace {

struct Cursor {
    const char* text;
    size_t length;
    size_t pos = 0;
    int line = 1;
    int column = 1;  // characters, not bytes: UTF-8 continuation bytes don't count

    bool AtEnd() const { return pos >= length; }
    char Peek(size_t ahead = 0) const { return pos + ahead < length ? text[pos + ahead] : '\0'; }
    void Advance() {
        if (AtEnd()) return;
        const unsigned char c = static_cast<unsigned char>(text[pos++]);
        if (c == '\n') {
            ++line;
            column = 1;
        } else if ((c & 0xC0) != 0x80) {
            ++column;
        }
    }
};

struct Place {
    int line, column;
};

struct Parser {
    KvtTree& tree;
    Cursor cur;
    bool failed = false;

    Place Here() const { return {cur.line, cur.column}; }

    bool Fail(Place at, const char* text) {
        if (!failed) {
            failed = true;
            tree.errorLine = at.line;
            tree.errorColumn = at.column;
            tree.errorText = text;
        }
        return false;
    }

    static bool IsLetter(char c) {
        return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_';
    }
    static bool IsDigit(char c) { return c >= '0' && c <= '9'; }

    void SkipBlanks() {
        while (cur.Peek() == ' ' || cur.Peek() == '\t' || cur.Peek() == '\r') cur.Advance();
    }
    void SkipComment() {
        if (cur.Peek() == '#')
            while (!cur.AtEnd() && cur.Peek() != '\n') cur.Advance();
    }
    // Blanks, comments and line ends.
    void SkipSpace() {
        for (;;) {
            SkipBlanks();
            SkipComment();
            if (cur.Peek() == '\n')
                cur.Advance();
            else
                return;
        }
    }

    std::string ReadName() {
        const size_t start = cur.pos;
        while (IsLetter(cur.Peek()) || IsDigit(cur.Peek())) cur.Advance();
        return std::string(cur.text + start, cur.pos - start);
    }

    // A quoted text; the cursor stands on the opening quote.
    bool ReadQuoted(std::string& out) {
        const Place open = Here();
        cur.Advance();
        out.clear();
        for (;;) {
            if (cur.AtEnd() || cur.Peek() == '\n') return Fail(open, "unterminated text");
            const char c = cur.Peek();
            if (c == '"') {
                cur.Advance();
                return true;
            }
            if (c == '\\' && (cur.Peek(1) == '"' || cur.Peek(1) == '\\')) {
                cur.Advance();
                out += cur.Peek();
                cur.Advance();
                continue;
            }
            out += c;
            cur.Advance();
        }
    }

    bool ReadNumber(KvtNode& p) {
        const Place start = Here();
        const size_t begin = cur.pos;
        if (cur.Peek() == '+' || cur.Peek() == '-') cur.Advance();
        if (IsLetter(cur.Peek())) {
            std::string word = ReadName();
            for (char& ch : word)
                ch = static_cast<char>(std::tolower(static_cast<unsigned char>(ch)));
            if (word != "inf" && word != "infinity" && word != "nan")
                return Fail(start, "expected a value");
            p.valueKind = KvtValueKind::Real;
            p.real = word == "nan" ? std::strtod("nan", nullptr) : std::strtod("inf", nullptr);
            if (cur.text[begin] == '-') p.real = -p.real;
            return true;
        }
        bool real = false;
        size_t digits = 0;
        while (IsDigit(cur.Peek())) cur.Advance(), ++digits;
        if (cur.Peek() == '.') {
            real = true;
            cur.Advance();
            while (IsDigit(cur.Peek())) cur.Advance(), ++digits;
        }
        if (digits == 0) return Fail(start, "expected a value");
        if (cur.Peek() == 'e' || cur.Peek() == 'E') {
            const size_t sign = (cur.Peek(1) == '+' || cur.Peek(1) == '-') ? 1 : 0;
            if (!IsDigit(cur.Peek(1 + sign))) return Fail(start, "malformed number");
            real = true;
            cur.Advance();
            if (sign) cur.Advance();
            while (IsDigit(cur.Peek())) cur.Advance();
        }
        if (IsLetter(cur.Peek()) || IsDigit(cur.Peek()) || cur.Peek() == '.')
            return Fail(start, "malformed number");
        const std::string token(cur.text + begin, cur.pos - begin);
        errno = 0;
        if (real) {
            p.valueKind = KvtValueKind::Real;
            p.real = std::strtod(token.c_str(), nullptr);
        } else {
            p.valueKind = KvtValueKind::Integer;
            p.integer = std::strtoll(token.c_str(), nullptr, 10);
            if (errno == ERANGE) return Fail(start, "integer out of range");
        }
        return true;
    }

    bool ReadValue(int keyword) {
        const Place start = Here();
        KvtNode p;
        const char c = cur.Peek();
        if (c == '"') {
            p.valueKind = KvtValueKind::Text;
            if (!ReadQuoted(p.text)) return false;
        } else if (c == 'f' && cur.pos + 5 <= cur.length &&
                   std::memcmp(cur.text + cur.pos, "file(", 5) == 0) {
            for (int i = 0; i < 5; ++i) cur.Advance();
            SkipBlanks();
            if (cur.Peek() != '"') return Fail(Here(), "expected a quoted file name after 'file('");
            p.valueKind = KvtValueKind::Filename;
            if (!ReadQuoted(p.text)) return false;
            SkipBlanks();
            if (cur.Peek() != ')') return Fail(Here(), "expected ')' after the file name");
            cur.Advance();
        } else if (IsLetter(c)) {
            std::string word = ReadName();
            std::string lower = word;
            for (char& ch : lower)
                ch = static_cast<char>(std::tolower(static_cast<unsigned char>(ch)));
            if (lower == "true" || lower == "false") {
                p.valueKind = KvtValueKind::Logical;
                p.logical = lower == "true";
            } else if (lower == "inf" || lower == "infinity" || lower == "nan") {
                p.valueKind = KvtValueKind::Real;
                p.real = std::strtod(lower.c_str(), nullptr);
            } else {
                return Fail(start,
                            "expected a value: a number, true, false, \"text\" or file(\"name\")");
            }
        } else if (IsDigit(c) || c == '+' || c == '-' || c == '.') {
            if (!ReadNumber(p)) return false;
        } else {
            return Fail(start, "expected a value after '='");
        }
        const int index = KvtAddNode(tree, keyword, KvtNodeKind::Param, "");
        KvtNode& stored = tree.nodes[index];
        stored.valueKind = p.valueKind;
        stored.integer = p.integer;
        stored.real = p.real;
        stored.logical = p.logical;
        stored.text = std::move(p.text);
        return true;
    }

    bool AtLineEnd() {
        const char c = cur.Peek();
        return cur.AtEnd() || c == '\n' || c == '#' || c == '}';
    }

    // After "name =": one or more values separated by commas, up to the end of the line.
    bool ReadValues(int keyword) {
        SkipBlanks();
        if (AtLineEnd()) return Fail(Here(), "expected a value after '='");
        for (;;) {
            if (!ReadValue(keyword)) return false;
            SkipBlanks();
            if (cur.Peek() == ',') {
                cur.Advance();
                SkipBlanks();
                if (AtLineEnd()) return Fail(Here(), "expected a value after ','");
                continue;
            }
            if (AtLineEnd()) return true;
            return Fail(Here(), "expected ',' or the end of the line after a value");
        }
    }

    // The statements of a block up to its '}' (or the end of the file at the top).
    bool ReadBlock(int parent, Place opened) {
        const bool top = parent == 0;
        for (;;) {
            SkipSpace();
            if (cur.AtEnd()) {
                if (top) return true;
                return Fail(opened, "a section was not closed");
            }
            const char c = cur.Peek();
            if (c == '}') {
                if (top) return Fail(Here(), "'}' without an open block");
                cur.Advance();
                return true;
            }
            if (c == '{') return Fail(Here(), "expected a name before '{'");
            if (!IsLetter(c)) return Fail(Here(), "expected a name");
            const Place at = Here();
            const std::string name = ReadName();
            SkipBlanks();
            if (cur.Peek() == '=') {
                if (top) return Fail(at, "a keyword must stand inside a target");
                cur.Advance();
                const int keyword = KvtAddNode(tree, parent, KvtNodeKind::Keyword, name);
                if (!ReadValues(keyword)) return false;
                continue;
            }
            if (cur.Peek() == '\n' || cur.Peek() == '#') {
                // A block may open on a later line.
                const Cursor saved = cur;
                SkipSpace();
                if (cur.Peek() != '{') {
                    cur = saved;
                    return Fail(Here(), "expected '=' or '{' after a name");
                }
            }
            if (cur.Peek() == '{') {
                cur.Advance();
                const int node = KvtAddNode(tree, parent,
                                            top ? KvtNodeKind::Target : KvtNodeKind::Section, name);
                if (!ReadBlock(node, at)) return false;
                continue;
            }
            return Fail(Here(), "expected '=' after a keyword name");
        }
    }
};

}  // namespace

bool KvtParse(KvtTree& tree, const char* text, size_t length) {
    Parser parser{tree, Cursor{text, length}};
    // A byte-order mark at the start is not part of the file's text.
    if (length >= 3 && std::memcmp(text, "\xEF\xBB\xBF", 3) == 0) parser.cur.pos = 3;
    return parser.ReadBlock(0, Place{1, 1});
}
