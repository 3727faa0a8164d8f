#pragma once

#include <gtest/gtest.h>

#include <string>
#include <vector>

// A test with an appliance of its own: a fresh directory that is the root while the test runs and
// is removed afterwards.
class Sandbox : public testing::Test {
  protected:
    Sandbox();
    ~Sandbox() override;

    const std::string& RootPath() const { return root; }

    // Writes a file of the appliance, making the directories above it.
    void Write(const std::string& path, const std::string& content) const;
    void MakeDirectory(const std::string& path) const;
    std::string Read(const std::string& path) const;

  private:
    std::string root;
};

// What the process has written to the system log since the last call, formatted, one element a
// call. Programs that link Sandbox.cpp have a system log of their own.
std::vector<std::string> TakeLog();
