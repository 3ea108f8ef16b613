// Bad input as users write it, from the corpus in tests/system/bad_input:
// each file there is what a user might give the engine, and each must end
// with its message, exit code 1 and "Abnormal completion", or run on with the
// warnings it names. A corpus file holds only the sections that differ from a
// small working model (a basin of 11 x 11 points, no processes, no outputs);
// its head says what it expects:
//   # expect: <a pattern the screen output must hold>
//   # warning: <a pattern of one warning; the run must end normally>
// The data files it names are made from the CDL texts of bad_input/data by
// ncgen ("name.xol2.cdl" makes name.xol2; "name.xol2.nc4.cdl" a NetCDF-4 file).
// Beside the corpus: a model file that can't be read, and an output file
// that another running engine writes.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <regex>
#include <sstream>

#include "support/model_builder.hpp"
#include "support/test_support.hpp"

namespace fs = std::filesystem;

namespace {

const fs::path kCorpus = fs::path(BW_SOURCE_DIR) / "tests/system/bad_input";

struct CorpusCase {
    std::string expect;
    std::vector<std::string> warnings;
    std::map<std::string, std::string> sections;  // top-level sections by name
    std::vector<std::string> dataFiles;           // named by file("...")
};

CorpusCase ReadCase(const fs::path& path) {
    CorpusCase c;
    std::ifstream in(path);
    std::string line, section, body;
    int depth = 0;
    const std::regex file("file\\(\"([^\"]+)\"\\)");
    while (std::getline(in, line)) {
        if (line.starts_with("# expect: ")) c.expect = line.substr(10);
        if (line.starts_with("# warning: ")) c.warnings.push_back(line.substr(11));
        for (std::sregex_iterator m(line.begin(), line.end(), file), end; m != end; ++m)
            c.dataFiles.push_back((*m)[1]);
        if (line.starts_with("#")) continue;
        if (depth == 0 && line.ends_with(" {")) {
            section = line.substr(0, line.size() - 2);
            body.clear();
            depth = 1;
            continue;
        }
        depth += static_cast<int>(std::count(line.begin(), line.end(), '{'));
        depth -= static_cast<int>(std::count(line.begin(), line.end(), '}'));
        if (depth == 0 && !section.empty()) {
            c.sections[section] = body;
            section.clear();
        } else if (depth > 0) {
            body += line + "\n";
        }
    }
    return c;
}

// Makes a data file of the corpus in dir from its CDL text.
void MakeDataFile(const bwtest::TempDir& dir, const std::string& name) {
    if (fs::exists(dir / name)) return;
    std::string cdl = (kCorpus / "data" / (name + ".cdl")).string(), kind = "cdf5";
    if (!fs::exists(cdl)) cdl = (kCorpus / "data" / (name + ".nc4.cdl")).string(), kind = "nc4";
    if (!fs::exists(cdl)) return;  // an output's name
    const bwtest::RunResult r =
        bwtest::RunProgram({"/usr/bin/ncgen", "-k", kind, "-o", dir / name, cdl}, dir.path);
    ASSERT_EQ(r.exitCode, 0) << r.err;
}

std::vector<std::string> CorpusFiles() {
    std::vector<std::string> names;
    for (const auto& entry : fs::directory_iterator(kCorpus))
        if (entry.path().extension() == ".bw") names.push_back(entry.path().stem().string());
    std::sort(names.begin(), names.end());
    return names;
}

bwtest::RunResult RunEngine(const bwtest::TempDir& dir, const std::string& model = "m.bw") {
    return bwtest::RunProgram({bwtest::BuiltProgram("bw"), model}, dir.path.string(),
                              {{"TARN_PROGRESS", "NONE"}, {"OMP_NUM_THREADS", "1"}},
                              {"BUILDMODE", "TRF"});
}

class BadInput : public testing::TestWithParam<std::string> {};

TEST_P(BadInput, EndsWithItsMessageOrRunsOnWithItsWarnings) {
    const CorpusCase c = ReadCase(kCorpus / (GetParam() + ".bw"));
    ASSERT_NE(c.expect.empty(), c.warnings.empty()) << "a corpus file expects a stop or warnings";
    bwtest::TempDir dir;
    MakeDataFile(dir, "bed.xol2");
    for (const std::string& name : c.dataFiles) MakeDataFile(dir, name);
    bwtest::WriteFile(dir / "m.bw", bwtest::ModelText("bed.xol2", c.sections));

    const bwtest::RunResult r = RunEngine(dir);
    const std::string log = bwtest::ReadFile(dir / "m.log");
    if (!c.expect.empty()) {
        EXPECT_EQ(r.exitCode, 1) << r.out << r.err;
        EXPECT_TRUE(std::regex_search(r.out, std::regex(c.expect))) << r.out;
        EXPECT_TRUE(log.ends_with("\nAbnormal completion\n"));
        EXPECT_EQ(r.err.find("terminate called"), std::string::npos) << r.err;
    } else {
        EXPECT_EQ(r.exitCode, 0) << r.out << r.err;
        // The log gives a warning in pieces of 61 characters, each further one
        // behind nine blanks on a line of its own and each trimmed: compared
        // without blanks.
        auto squeeze = [](const std::string& text) {
            return std::regex_replace(std::regex_replace(text, std::regex("\n {9}"), ""),
                                      std::regex(" "), "");
        };
        const std::string joined = squeeze(log);
        for (const std::string& w : c.warnings) {
            EXPECT_TRUE(std::regex_search(r.out, std::regex("Warning: " + w))) << w << "\n"
                                                                               << r.out;
            EXPECT_TRUE(std::regex_search(joined, std::regex("Warning:" + squeeze(w)))) << w;
        }
        EXPECT_TRUE(log.ends_with("\nSuccessful completion\n"));
    }
}

INSTANTIATE_TEST_SUITE_P(Corpus, BadInput, testing::ValuesIn(CorpusFiles()),
                         [](const auto& info) { return info.param; });

// A model file that is there but can't be read names the system's reason.
TEST(BadInputFiles, AnUnreadableModelFileIsReportedWithItsReason) {
    bwtest::TempDir dir;
    fs::create_directory(dir / "m.bw");
    const bwtest::RunResult r = RunEngine(dir);
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_EQ(r.out, "TARNEL BW: Unable to open m.bw: Is a directory\n");
}

// An output that a running engine writes is refused to a second run, with
// the holder named; once the holder is gone its lock file is stale, and the
// next run takes it over and removes it at its end.
TEST(BadInputFiles, AnOutputFileWrittenByAnotherRunIsRefused) {
    bwtest::TempDir dir;
    MakeDataFile(dir, "bed.xol2");
    const CorpusCase out = ReadCase(kCorpus / "records_huge.bw");
    std::string body = out.sections.at("Output_Deterministic_2D");
    body.replace(body.find("2147483647"), 10, "1");
    bwtest::WriteFile(dir / "m.bw",
                      bwtest::ModelText("bed.xol2", {{"Output_Deterministic_2D", body}}));

    const int fd = open((dir / "out.xol2.lock").c_str(), O_RDWR | O_CREAT, 0644);
    ASSERT_GE(fd, 0);
    ASSERT_EQ(flock(fd, LOCK_EX), 0);
    ASSERT_EQ(write(fd, "process 4242 on elsewhere\n", 26), 26);
    bwtest::RunResult r = RunEngine(dir);
    EXPECT_EQ(r.exitCode, 1);
    EXPECT_TRUE(
        std::regex_search(r.out, std::regex("CreateOutputDeterministic: .*/out.xol2 is being "
                                            "written by another run \\(process 4242 on "
                                            "elsewhere\\)")))
        << r.out;
    EXPECT_FALSE(fs::exists(dir / "out.xol2"));

    close(fd);  // the holder ends without removing its lock file
    r = RunEngine(dir);
    EXPECT_EQ(r.exitCode, 0) << r.out;
    EXPECT_TRUE(fs::exists(dir / "out.xol2"));
    EXPECT_FALSE(fs::exists(dir / "out.xol2.lock"));
}

}  // namespace
