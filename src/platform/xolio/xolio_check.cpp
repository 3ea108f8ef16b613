// A file is checked before the NetCDF library sees it: it must be a regular
// file this process may read and carry the mark of a NetCDF file. A file in
// one of the classic formats has its header walked as well: every count,
// name, type and dimension number of the header must fit in the file, and
// the file must hold every byte of data the header promises. The NetCDF
// library trusts what the header says, so a file cut short or a header whose
// counts reach beyond the file ends here, with this library's own reason,
// instead of in fill values, huge allocations or reads past a buffer.
#include <fcntl.h>
#include <netcdf.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <vector>

#include "platform/xolio/xolio_record.hpp"

namespace {

// a * b and a + b, or UINT64_MAX where they would overflow.
uint64_t Times(uint64_t a, uint64_t b) {
    uint64_t r = 0;
    return __builtin_mul_overflow(a, b, &r) ? UINT64_MAX : r;
}
uint64_t Plus(uint64_t a, uint64_t b) {
    uint64_t r = 0;
    return __builtin_add_overflow(a, b, &r) ? UINT64_MAX : r;
}

enum class Walk { Sound, NeedMore, CutShort, Broken };

// The walk of a classic header over the first bytes of the file. A read past
// what was loaded asks for more of the file; past the end of the file, the
// file is cut short. Counts are weighed against the rest of the file before
// anything is counted out.
struct HeaderWalk {
    const std::vector<char>& bytes;  // the first bytes of the file
    uint64_t fileSize;
    int version = 1;  // 1 classic, 2 64-bit offsets, 5 64-bit data
    size_t pos = 4;
    Walk state = Walk::Sound;
    std::string why;  // what is broken

    bool Ok() const { return state == Walk::Sound; }
    void Break(const std::string& text) {
        if (Ok()) state = Walk::Broken, why = text;
    }
    // Whether n more bytes exist; sets the state when they do not.
    bool Have(uint64_t n) {
        if (!Ok()) return false;
        if (Plus(pos, n) <= bytes.size()) return true;
        state = Plus(pos, n) > fileSize ? Walk::CutShort : Walk::NeedMore;
        return false;
    }
    uint64_t Read(size_t n) {
        if (!Have(n)) return 0;
        uint64_t v = 0;
        for (size_t i = 0; i < n; ++i) v = (v << 8) | static_cast<unsigned char>(bytes[pos++]);
        return v;
    }
    uint64_t Count() { return Read(version == 5 ? 8 : 4); }
    // A count of elements of at least `each` bytes, which must fit in the
    // rest of the file: a count beyond the rest is a file cut short, one
    // beyond the whole file a broken header.
    uint64_t CountOf(uint64_t each, const char* what) {
        const uint64_t n = Count();
        if (Ok() && Times(n, each) > fileSize - std::min<uint64_t>(pos, fileSize)) {
            if (n <= fileSize)
                state = Walk::CutShort;
            else
                Break(std::string("the header declares ") + std::to_string(n) + " " + what +
                      ", more than the file holds");
        }
        return Ok() ? n : 0;
    }
    void Skip(uint64_t n) {
        const uint64_t padded = Times(Plus(n, 3) / 4, 4);
        if (Have(padded)) pos += static_cast<size_t>(padded);
    }
    void SkipName() {
        const uint64_t length = Count();
        if (Ok() && length > NC_MAX_NAME)
            Break("the header holds a name of " + std::to_string(length) + " characters");
        Skip(length);
    }
    int TypeSize(uint64_t type) {
        static const int kSizes[] = {0, 1, 1, 2, 4, 4, 8, 1, 2, 4, 8, 8};
        if (type >= 1 && type <= (version == 5 ? 11u : 6u)) return kSizes[type];
        Break("the header holds an unknown type " + std::to_string(type));
        return 0;
    }
    void SkipAttributes() {
        const uint64_t tag = Read(4);
        if (Ok() && tag != 0 && tag != 0x0C) Break("the header is broken");
        const uint64_t n = CountOf(12, "attributes");
        for (uint64_t a = 0; a < n && Ok(); ++a) {
            SkipName();
            const int size = TypeSize(Read(4));
            const uint64_t count = CountOf(static_cast<uint64_t>(size), "attribute values");
            Skip(Times(count, static_cast<uint64_t>(size)));
        }
    }
};

// The end of the data a classic header promises, or the walk's failure.
Walk PromisedEnd(HeaderWalk& r, uint64_t& end) {
    r.version = r.bytes[3];
    uint64_t records = r.Count();
    if (records == (r.version == 5 ? UINT64_MAX : 0xFFFFFFFFu)) records = 0;  // streaming
    const uint64_t dimTag = r.Read(4);
    if (r.Ok() && dimTag != 0 && dimTag != 0x0A) r.Break("the header is broken");
    const uint64_t dims = r.CountOf(8, "axes");
    std::vector<uint64_t> lengths;
    for (uint64_t d = 0; d < dims && r.Ok(); ++d) {
        r.SkipName();
        lengths.push_back(r.Count());
    }
    r.SkipAttributes();
    const uint64_t varTag = r.Read(4);
    if (r.Ok() && varTag != 0 && varTag != 0x0B) r.Break("the header is broken");
    const uint64_t vars = r.CountOf(24, "variables");
    struct Var {
        uint64_t size, begin;
        bool record;
    };
    std::vector<Var> list;
    uint64_t recordSize = 0;
    for (uint64_t v = 0; v < vars && r.Ok(); ++v) {
        r.SkipName();
        const uint64_t rank = r.CountOf(4, "dimensions of a variable");
        bool record = false;
        uint64_t values = 1;
        for (uint64_t k = 0; k < rank && r.Ok(); ++k) {
            const uint64_t id = r.Count();
            if (!r.Ok()) break;
            if (id >= lengths.size()) {
                r.Break("a variable lies on an axis the header does not declare");
            } else if (lengths[id] == 0) {
                if (k != 0) r.Break("a variable has its record axis in another place than first");
                record = true;
            } else {
                values = Times(values, lengths[id]);
            }
        }
        r.SkipAttributes();
        const int typeSize = r.TypeSize(r.Read(4));
        r.Read(r.version == 5 ? 8 : 4);  // the size the writer noted; computed below instead
        const uint64_t begin = r.Read(r.version == 1 ? 4 : 8);
        const uint64_t size = Times(values, static_cast<uint64_t>(typeSize));
        list.push_back({size, begin, record});
        if (record) recordSize = Plus(recordSize, Times(Plus(size, 3) / 4, 4));
    }
    if (!r.Ok()) return r.state;
    end = r.pos;
    for (const Var& v : list) {
        const uint64_t last =
            v.record
                ? (records == 0 ? 0 : Plus(Plus(v.begin, Times(records - 1, recordSize)), v.size))
                : Plus(v.begin, v.size);
        end = std::max(end, last);
    }
    return Walk::Sound;
}

}  // namespace

std::string XolSystemText(int error) {
    std::string text = std::strerror(error);
    if (!text.empty() && text[0] >= 'A' && text[0] <= 'Z' && (text.size() < 2 || text[1] > 'Z'))
        text[0] = static_cast<char>(text[0] - 'A' + 'a');
    return text;
}

int XolCheckFile(const std::string& path, uint64_t& fileSize) {
    fileSize = 0;
    struct stat info;
    if (stat(path.c_str(), &info) != 0) return XolFail(kXolErrOpen, XolSystemText(errno));
    if (S_ISDIR(info.st_mode)) return XolFail(kXolErrOpen, "a folder, not a file");
    if (!S_ISREG(info.st_mode)) return XolFail(kXolErrOpen, "not a regular file");
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) return XolFail(kXolErrOpen, XolSystemText(errno));
    fileSize = static_cast<uint64_t>(info.st_size);
    // The first bytes, more as the walk of the header asks for them.
    std::vector<char> bytes;
    auto load = [&](uint64_t n) {
        const size_t want = static_cast<size_t>(std::min(n, fileSize));
        bytes.resize(want);
        size_t got = 0;
        while (got < want) {
            const ssize_t r = pread(fd, bytes.data() + got, want - got, static_cast<off_t>(got));
            if (r < 0 && errno == EINTR) continue;
            if (r <= 0) break;
            got += static_cast<size_t>(r);
        }
        bytes.resize(got);
        return got == want;
    };
    if (!load(65536)) {
        const int error = errno;
        close(fd);
        return XolFail(kXolErrOpen, XolSystemText(error != 0 ? error : EIO));
    }
    const bool classic = bytes.size() >= 4 && std::memcmp(bytes.data(), "CDF", 3) == 0 &&
                         (bytes[3] == 1 || bytes[3] == 2 || bytes[3] == 5);
    const bool hdf = bytes.size() >= 8 && std::memcmp(bytes.data(), "\x89HDF\r\n\x1a\n", 8) == 0;
    if (!classic && !hdf) {
        close(fd);
        if (bytes.empty()) return XolFail(kXolErrOpen, "the file is empty");
        const bool markCut =
            bytes.size() < 4 && std::memcmp(bytes.data(), "CDF", bytes.size()) == 0;
        return XolFail(kXolErrOpen,
                       markCut ? "the file is cut short" : "not a data file of this engine");
    }
    if (!classic) {
        close(fd);
        return 0;
    }
    for (;;) {
        HeaderWalk walk{bytes, fileSize, 1, 4, Walk::Sound, {}};
        uint64_t end = 0;
        const Walk state = PromisedEnd(walk, end);
        if (state == Walk::NeedMore) {
            if (load(Times(bytes.size(), 4))) continue;
            close(fd);
            return XolFail(kXolErrRead, XolSystemText(errno != 0 ? errno : EIO));
        }
        close(fd);
        if (state == Walk::Broken) return XolFail(kXolErrFormat, walk.why);
        // The last record of a file with one record variable may lack its padding.
        if (state == Walk::CutShort || end > Plus(fileSize, 3))
            return XolFail(kXolErrFormat, "the file is cut short");
        return 0;
    }
}
