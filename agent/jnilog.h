// The JNI-side log "../log/jni.log": plain narrow lines written only by the entry points. The
// operator switches it on by creating the file; it stays open until getReadyToExit.
#pragma once

#include <string>

constexpr const char* JNI_LOG_PATH = "../log/jni.log";

// True while the log is open; every JNI-side line is skipped otherwise.
bool JniLogOn();
// Opens the log for appending when the file exists; an open log is kept. Returns true when the
// file exists and the log is on.
bool JniLogOpen();
// Writes one formatted line (the format brings its own newline) when the log is on.
void JniLog(const char* format, ...) __attribute__((format(printf, 1, 2)));
// Switches the log off and closes it.
void JniLogClose();

// The text of a wide string for the narrow log, as UTF-8; a value that is no character
// becomes "?".
std::string NarrowForLog(const wchar_t* text);
