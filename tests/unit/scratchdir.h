// A temporary folder for tests that touch the file system, removed with its contents; a guard
// that runs a test inside a folder; the install tree the library writes its log beside.
#pragma once

#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <string>

// The whole file, or "" when it cannot be read.
inline std::string ReadAll(const std::string& path) {
    std::ostringstream text;
    text << std::ifstream(path, std::ios::binary).rdbuf();
    return text.str();
}

class ScratchDir {
  public:
    ScratchDir() {
        std::string pattern = "/tmp/velhtest.XXXXXX";
        if (mkdtemp(pattern.data()) == nullptr) {
            throw std::runtime_error("mkdtemp failed");
        }
        Root = pattern;
    }
    ~ScratchDir() {
        std::error_code ignored;
        std::filesystem::remove_all(Root, ignored);
    }
    ScratchDir(const ScratchDir&) = delete;
    ScratchDir& operator=(const ScratchDir&) = delete;

    const std::string& Path() const { return Root; }
    std::string Path(const std::string& relative) const { return Root + "/" + relative; }
    // Writes a file (binary), creating nothing but the file itself.
    std::string Write(const std::string& relative, const std::string& content) const {
        std::ofstream(Path(relative), std::ios::binary) << content;
        return Path(relative);
    }
    std::string Read(const std::string& relative) const { return ReadAll(Path(relative)); }

  private:
    std::string Root;
};

// A file of tests/unit/data: expected logs too long to read well inline.
inline std::string TestData(const std::string& name) {
    const std::string path = std::string(VELH_TEST_DATA) + "/" + name;
    if (!std::filesystem::exists(path)) {
        throw std::runtime_error("no test data " + name);
    }
    return ReadAll(path);
}

// Makes directory the working directory for the guard's lifetime.
class WorkingDir {
  public:
    explicit WorkingDir(const std::string& directory) : Previous(std::filesystem::current_path()) {
        std::filesystem::current_path(directory);
    }
    ~WorkingDir() {
        std::error_code ignored;
        std::filesystem::current_path(Previous, ignored);
    }

  private:
    std::filesystem::path Previous;
};

// An install directory "inst" with the hardware-information log's folder "log" beside it, made
// the working directory for the guard's lifetime.
class InstallTree {
  public:
    const ScratchDir& Scratch() const { return Dir; }
    std::string InstFile(const std::string& name) const { return Dir.Path("inst/" + name); }
    std::string Log() const { return Dir.Read("log/velhslot.slotmgr.hwinfo.log"); }
    bool Logged(const std::string& text) const { return Log().find(text) != std::string::npos; }

  private:
    ScratchDir Dir;
    bool Made = std::filesystem::create_directory(Dir.Path("inst")) &&
                std::filesystem::create_directory(Dir.Path("log"));
    WorkingDir Cwd{Dir.Path("inst")};
};
