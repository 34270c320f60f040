// Text for Java: the library keeps each byte of a narrow text as one wide character, so a
// name that pci.ids or a card file wrote in UTF-8 arrives here as its bytes.
#pragma once

#include <cstdint>

// Writes at most maxChars characters of text into out as UTF-16 and returns the number of
// units written (at most 2 * maxChars). When every character of the whole text is a byte and
// the bytes form valid UTF-8, they are decoded, a character above U+FFFF becoming a surrogate
// pair that is never split; any other text goes over one unit per character (its low 16 bits),
// so a Latin-1 text keeps its characters.
int32_t TextToUtf16(const wchar_t* text, uint16_t* out, int32_t maxChars);
