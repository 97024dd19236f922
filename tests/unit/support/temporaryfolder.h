// A folder of a test's own, removed with all it holds at the end.
#pragma once

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string>
#include <string_view>

class TemporaryFolder {
public:
    TemporaryFolder() : name(std::filesystem::temp_directory_path() / "tolkwd-test-XXXXXX")
    {
        if (mkdtemp(name.data()) == nullptr) {
            throw std::runtime_error("cannot make " + name);
        }
        name += "/";
    }
    ~TemporaryFolder()
    {
        std::error_code ignored;
        std::filesystem::remove_all(name, ignored);
    }
    TemporaryFolder(const TemporaryFolder&) = delete;
    TemporaryFolder& operator=(const TemporaryFolder&) = delete;

    // The folder itself, with trailing slash.
    [[nodiscard]] const std::string& path() const { return name; }

    // The path of a file in it.
    [[nodiscard]] std::string path(const std::string& file) const { return name + file; }

    // Makes or replaces a file in it.
    void write(const std::string& file, std::string_view content) const
    {
        std::ofstream(path(file), std::ios::binary) << content;
    }

    [[nodiscard]] std::string read(const std::string& file) const
    {
        std::ifstream stream(path(file), std::ios::binary);
        return {std::istreambuf_iterator<char>(stream), std::istreambuf_iterator<char>()};
    }

private:
    std::string name;
};
