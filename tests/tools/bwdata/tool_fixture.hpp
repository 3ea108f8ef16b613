// Runs the bwdata tool in a folder of its own, as a user would from a shell.
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <string>
#include <vector>

#include "support/test_support.hpp"

class DataTool : public testing::Test {
protected:
    bwtest::TempDir dir;
    bwtest::RunResult Run(std::vector<std::string> args) {
        args.insert(args.begin(), bwtest::BuiltProgram("bwdata"));
        return bwtest::RunProgram(args, dir.path.string());
    }
    // Runs the tool where it must succeed.
    void Ok(const std::vector<std::string>& args) {
        const auto r = Run(args);
        EXPECT_EQ(r.exitCode, 0) << r.err;
    }
    // Refused with exit code 1 and "bwdata: " and `message` on standard error,
    // leaving neither the output named after -o nor its scratch file behind.
    void Refused(const std::vector<std::string>& args, const std::string& message) {
        const auto r = Run(args);
        EXPECT_EQ(r.exitCode, 1) << args[0];
        EXPECT_EQ(r.err.rfind("bwdata: ", 0), 0u) << r.err;
        EXPECT_NE(r.err.find(message), std::string::npos) << r.err;
        const auto o = std::find(args.begin(), args.end(), "-o");
        ASSERT_TRUE(o != args.end() && o + 1 != args.end());
        EXPECT_FALSE(std::filesystem::exists(dir / *(o + 1)));
        EXPECT_FALSE(std::filesystem::exists(dir / (*(o + 1) + ".part")));
    }
};
