// The fixture of all tests that let the daemon's modules work: a folder and a log of their own,
// settings and process-wide state as at the program's start, and the World.
#pragma once

#include <chrono>
#include <string>
#include <thread>

#include <gtest/gtest.h>

#include "temporaryfolder.h"
#include "world.h"

// Whether `condition` comes true within a minute.
template <typename Condition>
bool await(Condition condition)
{
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::minutes(1);
    while (!condition()) {
        if (std::chrono::steady_clock::now() > deadline) {
            return false;
        }
        std::this_thread::yield();
    }
    return true;
}

class DaemonTest : public ::testing::Test {
protected:
    // `module`: the module whose log lines the test is about; see World::reset.
    explicit DaemonTest(std::string module);

    void SetUp() override;
    void TearDown() override;

    // What went to standard output since the test began or since the last call.
    std::string takestdout();

    World& world = World::current();
    const TemporaryFolder folder; // holds the log ("log") and the pings' files

private:
    std::string homemodule;
};
