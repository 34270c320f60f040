// Field lines of the dumps: a label right-aligned in a fixed width, a separator, a value.
#pragma once

#include <cstdint>
#include <string>

#include "diag/hwdebug.h"

class FieldWriter {
  public:
    // numberForm formats a number; it is handed the value and then the value again as a
    // signed 32-bit number, so "0x%02x  (%d)" shows both and "%d" shows -1 for 0xffffffff.
    FieldWriter(int width, const char* separator, const char* numberForm)
        : Width(width), Separator(separator), NumberForm(numberForm) {}

    void Number(const std::string& label, uint32_t value) const {
        Number(label, value, NumberForm);
    }
    void Number(const std::string& label, uint32_t value, const char* form) const {
        dbgprint(Format(label, form).c_str(), value, static_cast<int32_t>(value));
    }
    void Text(const std::string& label, const wchar_t* text) const {
        dbgprint(Format(label, "%s").c_str(), text != nullptr ? text : L"");
    }
    void Flag(const std::string& label, bool value) const {
        Text(label, value ? L"True" : L"False");
    }

  private:
    // Labels hold no conversion of their own: an index is part of the label text.
    std::string Format(const std::string& label, const char* form) const {
        std::string line;
        if (static_cast<int>(label.size()) < Width) {
            line.assign(static_cast<size_t>(Width) - label.size(), ' ');
        }
        return line.append(label).append(Separator).append(form).append("\n");
    }

    int Width;
    const char* Separator;
    const char* NumberForm;
};

// "\n", a title line, "\n": the head of every dump block.
inline void DumpTitle(const char* title) {
    dbgprint("\n");
    dbgprint(title);
    dbgprint("\n");
}

// A label with an index in brackets, such as "BAR[0]".
inline std::string Indexed(const char* name, int index) {
    return std::string(name) + "[" + std::to_string(index) + "]";
}
