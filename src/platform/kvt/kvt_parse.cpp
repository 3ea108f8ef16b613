// The loader of parameter files: a hand-written reader that builds the tree as
// it goes and stops at the first syntax error, with its line, its column in
// characters (UTF-8 code points, a tab is one) and a text of what was
// expected. Open targets and sections are kept on a stack of their own, so the
// depth of nesting is bounded by memory and not by the call stack.
//
// Grammar, one statement a line; '}' may close a block behind a statement,
// and a '}' may be followed by more on its line:
//   file      = { target }
//   target    = name '{' { statement } '}'
//   statement = name '{' { statement } '}' | name '=' value { ',' value }
//   value     = integer | real | logical | "text" | file("text")
// A '{' may stand on the line of its name or on a later one.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <cstring>
#include <string>
#include <vector>

#include "platform/kvt/kvt_internal.hpp"

namespace {

// Why the last kvtLoadFile failed; "" when the file does not exist.
std::string gFileError;

// Reads a regular file whole, or keeps the reason it can't in gFileError.
// Opened without waiting, so that a pipe or a device named by mistake does
// not block the load.
bool ReadWholeFile(const char* path, std::string& text) {
    const int fd = open(path, O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (fd < 0) {
        if (errno != ENOENT && errno != ENOTDIR) gFileError = std::strerror(errno);
        return false;
    }
    struct stat info {};
    if (fstat(fd, &info) != 0) {
        gFileError = std::strerror(errno);
    } else if (S_ISDIR(info.st_mode)) {
        gFileError = std::strerror(EISDIR);
    } else if (!S_ISREG(info.st_mode)) {
        gFileError = "not a regular file";
    } else {
        text.reserve(static_cast<size_t>(info.st_size));
        char buffer[1 << 16];
        for (;;) {
            const ssize_t n = read(fd, buffer, sizeof buffer);
            if (n > 0) {
                text.append(buffer, static_cast<size_t>(n));
            } else if (n == 0) {
                break;
            } else if (errno != EINTR) {
                gFileError = std::strerror(errno);
                break;
            }
        }
    }
    close(fd);
    return gFileError.empty();
}

struct Place {
    int line = 1;
    int column = 1;
};

struct Cursor {
    const char* text;
    size_t length;
    size_t pos = 0;
    Place place;

    bool AtEnd() const { return pos >= length; }
    char Peek(size_t ahead = 0) const { return pos + ahead < length ? text[pos + ahead] : '\0'; }
    void Advance() {
        if (AtEnd()) return;
        const unsigned char c = static_cast<unsigned char>(text[pos++]);
        if (c == '\n') {
            ++place.line;
            place.column = 1;
        } else if ((c & 0xC0) != 0x80) {  // continuation bytes are not characters
            ++place.column;
        }
    }
    void Advance(size_t count) {
        for (size_t i = 0; i < count; ++i) Advance();
    }
};

bool IsLetter(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_';
}
bool IsDigit(char c) {
    return c >= '0' && c <= '9';
}

std::string Lower(std::string word) {
    for (char& c : word)
        if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
    return word;
}

struct Value {
    KvtValueKind kind = KvtValueKind::Integer;
    int64_t integer = 0;
    double real = 0.0;
    bool logical = false;
    std::string text;
};

struct Parser {
    KvtTree& tree;
    Cursor cur;

    bool Fail(Place at, const char* text) {
        tree.errorLine = at.line;
        tree.errorColumn = at.column;
        tree.errorText = text;
        return false;
    }

    void SkipBlanks() {
        while (cur.Peek() == ' ' || cur.Peek() == '\t' || cur.Peek() == '\r') cur.Advance();
    }
    // Blanks, comments and line ends.
    void SkipSpace() {
        for (;;) {
            SkipBlanks();
            if (cur.Peek() == '#')
                while (!cur.AtEnd() && cur.Peek() != '\n') cur.Advance();
            if (cur.AtEnd() || cur.Peek() != '\n') return;
            cur.Advance();
        }
    }
    // The end of a statement: the line's end, a comment or a closing '}'.
    bool AtStatementEnd() const {
        const char c = cur.Peek();
        return cur.AtEnd() || c == '\n' || c == '#' || c == '}';
    }

    std::string ReadName() {
        const size_t start = cur.pos;
        while (IsLetter(cur.Peek()) || IsDigit(cur.Peek())) cur.Advance();
        return std::string(cur.text + start, cur.pos - start);
    }

    // A quoted text on one line; the cursor stands on the opening quote. \" and
    // \\ are escapes, a backslash before anything else is itself.
    bool ReadQuoted(std::string& out) {
        const Place open = cur.place;
        cur.Advance();
        for (;;) {
            if (cur.AtEnd() || cur.Peek() == '\n') return Fail(open, "unterminated text");
            const char c = cur.Peek();
            if (c == '"') {
                cur.Advance();
                return true;
            }
            if (c == '\0') return Fail(cur.place, "a text can't hold a NUL character");
            if (c == '\\' && (cur.Peek(1) == '"' || cur.Peek(1) == '\\')) cur.Advance();
            out += cur.Peek();
            cur.Advance();
        }
    }

    // A number, inf or nan, with an optional sign.
    bool ReadNumber(Value& v) {
        const Place start = cur.place;
        const size_t begin = cur.pos;
        if (cur.Peek() == '+' || cur.Peek() == '-') cur.Advance();
        const size_t unsignedBegin = cur.pos;
        if (IsLetter(cur.Peek())) {
            const std::string word = Lower(ReadName());
            if (word != "inf" && word != "nan") return Fail(start, "malformed number");
        } else {
            size_t digits = 0;
            bool real = false;
            while (IsDigit(cur.Peek())) cur.Advance(), ++digits;
            if (cur.Peek() == '.') {
                real = true;
                cur.Advance();
                while (IsDigit(cur.Peek())) cur.Advance(), ++digits;
            }
            if (digits == 0) return Fail(start, "malformed number");
            if (cur.Peek() == 'e' || cur.Peek() == 'E') {
                const size_t sign = (cur.Peek(1) == '+' || cur.Peek(1) == '-') ? 1 : 0;
                if (!IsDigit(cur.Peek(1 + sign))) return Fail(start, "malformed number");
                real = true;
                cur.Advance(1 + sign);
                while (IsDigit(cur.Peek())) cur.Advance();
            }
            if (IsLetter(cur.Peek()) || cur.Peek() == '.') return Fail(start, "malformed number");
            if (!real) {
                // from_chars takes no '+', and a '-' only as part of the number.
                const char* first = cur.text + (cur.text[begin] == '-' ? begin : unsignedBegin);
                const auto r = std::from_chars(first, cur.text + cur.pos, v.integer);
                if (r.ec != std::errc()) return Fail(start, "integer out of range");
                v.kind = KvtValueKind::Integer;
                return true;
            }
        }
        const char* first = cur.text + (cur.text[begin] == '-' ? begin : unsignedBegin);
        const auto r = std::from_chars(first, cur.text + cur.pos, v.real);
        if (r.ec != std::errc() || r.ptr != cur.text + cur.pos)
            return Fail(start, "real out of range");
        v.kind = KvtValueKind::Real;
        return true;
    }

    bool ReadValue(int keyword) {
        const Place start = cur.place;
        Value v;
        const char c = cur.Peek();
        if (c == '"') {
            v.kind = KvtValueKind::Text;
            if (!ReadQuoted(v.text)) return false;
        } else if (c == 'f' && cur.length - cur.pos >= 5 &&
                   std::memcmp(cur.text + cur.pos, "file(", 5) == 0) {
            cur.Advance(5);
            SkipBlanks();
            if (cur.Peek() != '"') return Fail(cur.place, "expected a quoted name after 'file('");
            v.kind = KvtValueKind::Filename;
            if (!ReadQuoted(v.text)) return false;
            SkipBlanks();
            if (cur.Peek() != ')') return Fail(cur.place, "expected ')' after the file name");
            cur.Advance();
        } else if (IsLetter(c)) {
            const Cursor wordStart = cur;
            const std::string word = Lower(ReadName());
            if (word == "true" || word == "false") {
                v.kind = KvtValueKind::Logical;
                v.logical = word == "true";
            } else if (word == "inf" || word == "nan") {
                cur = wordStart;
                if (!ReadNumber(v)) return false;
            } else {
                return Fail(start,
                            "expected a value: a number, true, false, \"text\" or file(\"name\")");
            }
        } else if (IsDigit(c) || c == '+' || c == '-' || c == '.') {
            if (!ReadNumber(v)) return false;
        } else {
            return Fail(start,
                        "expected a value: a number, true, false, \"text\" or file(\"name\")");
        }
        KvtNode& p = tree.nodes[KvtAddNode(tree, keyword, KvtNodeKind::Param, "")];
        p.valueKind = v.kind;
        p.integer = v.integer;
        p.real = v.real;
        p.logical = v.logical;
        p.text = std::move(v.text);
        return true;
    }

    // After "name =": one or more values separated by commas, to the statement's end.
    bool ReadValues(int keyword) {
        SkipBlanks();
        if (AtStatementEnd()) return Fail(cur.place, "expected a value after '='");
        for (;;) {
            if (!ReadValue(keyword)) return false;
            SkipBlanks();
            if (AtStatementEnd()) return true;
            if (cur.Peek() != ',')
                return Fail(cur.place, "expected ',' or the end of the line after a value");
            cur.Advance();
            SkipBlanks();
            if (AtStatementEnd()) return Fail(cur.place, "expected a value after ','");
        }
    }

    struct Open {
        int node;
        Place at;  // of its name, for "not closed"
    };

    bool Run() {
        std::vector<Open> open;
        for (;;) {
            SkipSpace();
            const int parent = open.empty() ? 0 : open.back().node;
            if (cur.AtEnd()) {
                if (open.empty()) return true;
                const bool target = tree.nodes[parent].kind == KvtNodeKind::Target;
                return Fail(open.back().at,
                            target ? "a target was not closed" : "a section was not closed");
            }
            const char c = cur.Peek();
            if (c == '}') {
                if (open.empty()) return Fail(cur.place, "'}' without an open block");
                open.pop_back();
                cur.Advance();
                continue;
            }
            if (c == '{') return Fail(cur.place, "expected a name before '{'");
            if (!IsLetter(c)) return Fail(cur.place, "expected a name");
            const Place at = cur.place;
            const std::string name = ReadName();
            SkipBlanks();
            if (cur.Peek() == '=') {
                if (open.empty()) return Fail(at, "a keyword must stand inside a target");
                cur.Advance();
                const int keyword = KvtAddNode(tree, parent, KvtNodeKind::Keyword, name);
                tree.nodes[keyword].line = at.line;
                if (ReadValues(keyword)) continue;
                // What was read of the line stays, but not a keyword without values.
                if (tree.nodes[keyword].children.empty()) KvtDropLastNode(tree);
                return false;
            }
            if (cur.Peek() == '\n' || cur.Peek() == '#') {
                // The block may open on a later line.
                const Cursor nameEnd = cur;
                SkipSpace();
                if (cur.Peek() != '{') {
                    cur = nameEnd;
                    return Fail(cur.place, open.empty() ? "expected '{' after a target name"
                                                        : "expected '=' or '{' after a name");
                }
            }
            if (cur.Peek() != '{') {
                return Fail(cur.place, open.empty() ? "expected '{' after a target name"
                                                    : "expected '=' after a keyword name");
            }
            cur.Advance();
            const KvtNodeKind kind = open.empty() ? KvtNodeKind::Target : KvtNodeKind::Section;
            open.push_back({KvtAddNode(tree, parent, kind, name), at});
            tree.nodes[open.back().node].line = at.line;
        }
    }
};

}  // namespace

bool KvtParse(KvtTree& tree, const char* text, size_t length) {
    Parser parser{tree, Cursor{text, length, 0, Place{}}};
    // A byte-order mark at the start is not part of the text.
    if (length >= 3 && std::memcmp(text, "\xEF\xBB\xBF", 3) == 0) parser.cur.pos = 3;
    return parser.Run();
}

KvtHandle kvtLoadText(const char* text, uint64_t length, const char* path, KvtHandle* file) {
    if (file != nullptr) *file = 0;
    if (text == nullptr && length > 0) {
        KvtSetError(kKvtErrFile);
        return 0;
    }
    KvtTree* tree = KvtNewTree(path);
    const KvtHandle handle = KvtMakeHandle(*tree, 0);
    if (file != nullptr) *file = handle;
    const bool clean = KvtParse(*tree, text != nullptr ? text : "", static_cast<size_t>(length));
    KvtSetError(clean ? kKvtOk : kKvtErrSyntax);
    return handle;
}

const char* kvtGetFileErrorText() {
    return gFileError.c_str();
}

KvtHandle kvtLoadFile(const char* path, int /*option*/, KvtHandle* file) {
    if (file != nullptr) *file = 0;
    gFileError.clear();
    std::string text;
    if (path == nullptr || !ReadWholeFile(path, text)) {
        KvtSetError(kKvtErrFile);
        return 0;
    }
    return kvtLoadText(text.data(), text.size(), path, file);
}
