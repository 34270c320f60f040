#include "agent/utf16.h"

namespace {

// The code point of the UTF-8 sequence at text, with its length in *length; -1 for a byte
// that starts no valid sequence (a stray continuation, an overlong form, a surrogate, a code
// past U+10FFFF, a character above 0xFF, or a sequence cut short).
int32_t DecodeOne(const wchar_t* text, int32_t* length) {
    const auto lead = static_cast<uint32_t>(static_cast<int32_t>(text[0]));
    int32_t count = 0;
    uint32_t code = 0;
    uint32_t least = 0;
    if (lead < 0x80) {
        *length = 1;
        return static_cast<int32_t>(lead);
    }
    if (lead >= 0xC2 && lead <= 0xDF) {
        count = 2;
        code = lead & 0x1Fu;
        least = 0x80;
    } else if (lead >= 0xE0 && lead <= 0xEF) {
        count = 3;
        code = lead & 0x0Fu;
        least = 0x800;
    } else if (lead >= 0xF0 && lead <= 0xF4) {
        count = 4;
        code = lead & 0x07u;
        least = 0x10000;
    } else {
        return -1;
    }
    for (int32_t i = 1; i < count; ++i) {
        const auto next = static_cast<uint32_t>(static_cast<int32_t>(text[i]));
        if ((next & 0xC0u) != 0x80u || next > 0xFFu) {  // The terminator ends here too.
            return -1;
        }
        code = (code << 6) | (next & 0x3Fu);
    }
    if (code < least || code > 0x10FFFF || (code >= 0xD800 && code <= 0xDFFF)) {
        return -1;
    }
    *length = count;
    return static_cast<int32_t>(code);
}

bool IsUtf8(const wchar_t* text) {
    int32_t length = 0;
    for (const wchar_t* at = text; *at != L'\0'; at += length) {
        if (DecodeOne(at, &length) < 0) {
            return false;
        }
    }
    return true;
}

}  // namespace

int32_t TextToUtf16(const wchar_t* text, uint16_t* out, int32_t maxChars) {
    int32_t units = 0;
    if (!IsUtf8(text)) {
        for (; units < maxChars && text[units] != L'\0'; ++units) {
            out[units] = static_cast<uint16_t>(static_cast<uint32_t>(text[units]) & 0xFFFFu);
        }
        return units;
    }
    int32_t length = 0;
    for (int32_t chars = 0; chars < maxChars && *text != L'\0'; ++chars, text += length) {
        const auto code = static_cast<uint32_t>(DecodeOne(text, &length));
        if (code > 0xFFFF) {
            out[units++] = static_cast<uint16_t>(0xD800 + ((code - 0x10000) >> 10));
            out[units++] = static_cast<uint16_t>(0xDC00 + ((code - 0x10000) & 0x3FF));
        } else {
            out[units++] = static_cast<uint16_t>(code);
        }
    }
    return units;
}
