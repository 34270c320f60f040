// A temporary folder for tests that touch the file system, removed with its contents, and a
// guard that runs a test inside a folder and returns to the previous one.
#pragma once

#include <ftw.h>
#include <stdlib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string>

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
        nftw(
            Root.c_str(),
            [](const char* path, const struct stat*, int, struct FTW*) { return remove(path); }, 16,
            FTW_DEPTH | FTW_PHYS);
    }
    ScratchDir(const ScratchDir&) = delete;
    ScratchDir& operator=(const ScratchDir&) = delete;

    const std::string& Path() const { return Root; }
    std::string Path(const std::string& relative) const { return Root + "/" + relative; }

    // Writes a file (binary), creating nothing but the file itself.
    std::string Write(const std::string& relative, const std::string& content) const {
        std::string path = Path(relative);
        std::ofstream(path, std::ios::binary) << content;
        return path;
    }
    std::string Read(const std::string& relative) const {
        std::ifstream in(Path(relative), std::ios::binary);
        return std::string((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    }

  private:
    std::string Root;
};

// A file of tests/unit/data: expected logs too long to read well inline.
inline std::string TestData(const std::string& name) {
    std::ifstream in(std::string(VELH_TEST_DATA) + "/" + name, std::ios::binary);
    if (!in) {
        throw std::runtime_error("no test data " + name);
    }
    return std::string((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
}

// Makes directory the working directory for the guard's lifetime.
class WorkingDir {
  public:
    explicit WorkingDir(const std::string& directory) {
        char* previous = getcwd(nullptr, 0);
        if (previous == nullptr || chdir(directory.c_str()) != 0) {
            free(previous);
            throw std::runtime_error("cannot enter " + directory);
        }
        Previous = previous;
        free(previous);
    }
    ~WorkingDir() {
        if (chdir(Previous.c_str()) != 0) {
            perror("chdir back");
        }
    }
    WorkingDir(const WorkingDir&) = delete;
    WorkingDir& operator=(const WorkingDir&) = delete;

  private:
    std::string Previous;
};

// An install directory "inst" with the hardware-information log's folder "log" beside it, made
// the working directory for the guard's lifetime.
class InstallTree {
  public:
    InstallTree() : Inst(MakeDirs(Dir)), Cwd(Inst) {}
    const ScratchDir& Scratch() const { return Dir; }
    std::string InstFile(const std::string& name) const { return Dir.Path("inst/" + name); }
    std::string Log() const { return Dir.Read("log/velhslot.slotmgr.hwinfo.log"); }

  private:
    static std::string MakeDirs(const ScratchDir& dir) {
        if (mkdir(dir.Path("inst").c_str(), 0700) != 0 ||
            mkdir(dir.Path("log").c_str(), 0700) != 0) {
            throw std::runtime_error("cannot make the install tree");
        }
        return dir.Path("inst");
    }

    ScratchDir Dir;
    std::string Inst;
    WorkingDir Cwd;
};
