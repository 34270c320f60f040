// What every fuzz target shares. The library writes its log relative to the working directory
// ("../log/..."), and some harnesses hand it files: all of that goes into a scratch tree made
// at start-up and removed at exit.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <string>
#include <vector>

// LLVMFuzzerInitialize, defined here for every harness, makes <scratch>/inst the working
// directory, with <scratch>/log beside it, and then calls this if the harness defines it.
void SetUpHarness() __attribute__((weak));

// The path of `name` inside the scratch tree, beside inst and log.
std::string ScratchPath(const std::string& name);

// Starts one input afresh: the log is deleted (so it never grows across inputs) and the debug
// level is 0.
void StartInput();

// Writes the bytes to path, replacing the file; stops the run if it cannot.
void WriteFile(const std::string& path, const uint8_t* data, size_t size);

// The input as a read-only stream, for parsers that read files.
class InputStream {
  public:
    InputStream(const uint8_t* data, size_t size);
    ~InputStream();
    InputStream(const InputStream&) = delete;
    InputStream& operator=(const InputStream&) = delete;

    // Back at the start of the input; stops the run if the stream could not be made.
    FILE* FromStart();

  private:
    // The bytes and one more, so that an empty input still has a buffer to stream from.
    std::vector<char> Bytes;
    FILE* Stream;
};

// Stops the run: a property that the parser under test must keep did not hold.
[[noreturn]] void Violated(const char* what);
