// What every fuzz target shares. The library writes its log relative to the working directory
// ("../log/..."), and some targets hand it files: all of that goes into a scratch tree made at
// start-up and removed at exit.
#pragma once

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <string>
#include <vector>

#include "dbglevel.h"
#include "model/hwobjects.h"
#include "util/sysaccess.h"

// Called, when a target defines it, once <scratch>/inst is the working directory.
void SetUpHarness() __attribute__((weak));
// The path of `name` inside the scratch tree, beside inst and log.
std::string ScratchPath(const std::string& name);
// One input, run afresh: made, it deletes the log (so it never grows across inputs) and sets the
// debug level to 0; gone, it empties the object lists that the input filled.
struct InputScope {
    InputScope();
    ~InputScope();
};
// Writes the bytes to path, replacing the file.
void WriteFile(const std::string& path, const uint8_t* data, size_t size);
// The input as a read-only stream at its start, for readers of files; valid until the next call.
FILE* InputStream(const uint8_t* data, size_t size);
// query_module answers from now on with these bytes: a little-endian 16-bit count, as the kernel
// reports it for a symbol list, then the buffer it fills.
void AnswerQueryModule(const uint8_t* data, size_t size);
// Stops the run, saying what went wrong, unless a property of the code under test holds.
void Check(bool holds, const std::string& violation);
