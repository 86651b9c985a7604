// A scratch SQL directory, scratch and log directories, an installer set up
// as after init, and the stand-in loader first on PATH, recording what it saw.
#pragma once

#include <gtest/gtest.h>

#include <functional>
#include <map>
#include <string>
#include <vector>

#include "qsd/installer/installer610.h"
#include "support/test_support.h"

class SeedingTest : public ::testing::Test {
  protected:
    void SetUp() override;
    void TearDown() override;

    std::string response_path() const;
    std::string catalog() const;
    // Every catalog line that records the file.
    int catalog_count(const std::string& file_name) const;
    std::string recorded_response(const std::string& file_name) const;
    std::string recorded_environment(const std::string& file_name) const;
    // Runs with every trace class on and keeps the lines in `out`.
    int run_traced(const std::function<int()>& body);

    zr7test::TempDir tmp;
    std::string sqllib = tmp / "tables/cicatrsq/SQLLIB";
    std::string scratch = tmp / "scratch";
    std::string logs = tmp / "logs";
    std::string record = tmp / "record";
    Installer610 installer;
    std::string out;

  private:
    std::map<std::string, std::string> saved_;
};

// True when every message appears as a trace line, in this order.
bool trace_lines_in_order(const std::string& output, const std::vector<std::string>& messages);
