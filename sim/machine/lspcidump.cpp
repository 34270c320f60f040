#include "sim/machine/lspcidump.h"

#include "sim/common/textfile.h"

namespace velhsim {

namespace {

constexpr size_t MAX_CONFIG_BYTES = 4096;
constexpr size_t BYTES_PER_ROW = 16;

// One hexadecimal field of an address, of exactly `width` digits.
std::optional<unsigned> AddressField(std::string_view text, size_t width, unsigned limit) {
    if (text.size() != width || text.find_first_not_of("0123456789abcdefABCDEF") != text.npos) {
        return std::nullopt;
    }
    const std::optional<uint64_t> value = ParseHex(text);
    if (!value || *value > limit) {
        return std::nullopt;
    }
    return static_cast<unsigned>(*value);
}

// "[DDDD:]BB:DD.F"
bool ParseAddress(std::string_view word, PciFunctionDump* function) {
    const size_t dot = word.rfind('.');
    if (dot == std::string_view::npos) {
        return false;
    }
    std::vector<std::string_view> fields;
    std::string_view rest = word.substr(0, dot);
    for (size_t colon; (colon = rest.find(':')) != std::string_view::npos;) {
        fields.push_back(rest.substr(0, colon));
        rest.remove_prefix(colon + 1);
    }
    fields.push_back(rest);
    if (fields.size() == 2) {
        fields.insert(fields.begin(), "0000");
    }
    if (fields.size() != 3) {
        return false;
    }
    const std::optional<unsigned> domain = AddressField(fields[0], 4, 0xffff);
    const std::optional<unsigned> bus = AddressField(fields[1], 2, 0xff);
    const std::optional<unsigned> device = AddressField(fields[2], 2, 0x1f);
    const std::optional<unsigned> fn = AddressField(word.substr(dot + 1), 1, 7);
    if (!domain || !bus || !device || !fn) {
        return false;
    }
    function->Domain = *domain;
    function->Bus = *bus;
    function->Device = *device;
    function->Function = *fn;
    return true;
}

// "1K", "128K", "4M", "256": a size in bytes.
std::optional<uint64_t> ParseSize(std::string_view text) {
    uint64_t scale = 1;
    if (!text.empty()) {
        switch (text.back()) {
            case 'K':
                scale = uint64_t{1} << 10;
                break;
            case 'M':
                scale = uint64_t{1} << 20;
                break;
            case 'G':
                scale = uint64_t{1} << 30;
                break;
            case 'T':
                scale = uint64_t{1} << 40;
                break;
            default:
                break;
        }
        if (scale != 1) {
            text.remove_suffix(1);
        }
    }
    const std::optional<uint64_t> value = ParseNumber(text);
    if (!value) {
        return std::nullopt;
    }
    return *value * scale;
}

class DumpReader {
  public:
    DumpReader(std::vector<PciFunctionDump>* functions, std::string* error)
        : Functions(functions), Error(error) {}

    bool Line(int number, std::string_view line) {
        Number = number;
        if (Trim(line).empty() || Trim(line).front() == '#') {
            return true;
        }
        if (line.front() == ' ' || line.front() == '\t') {
            return Detail(Trim(line));
        }
        const std::vector<std::string> words = SplitWords(line);
        if (words[0].back() == ':' && words[0].find('.') == std::string::npos) {
            return Row(words);
        }
        return Header(words[0]);
    }

    bool Finish() { return EndFunction(); }

  private:
    bool Fail(const std::string& message) {
        *Error = "line " + std::to_string(Number) + ": " + message;
        return false;
    }

    bool EndFunction() {
        if (!Functions->empty() && Functions->back().Config.empty()) {
            Number = HeaderLine;
            return Fail("the function has no configuration bytes (dump with lspci -xxx)");
        }
        return true;
    }

    bool Header(const std::string& word) {
        PciFunctionDump function;
        if (!ParseAddress(word, &function)) {
            return Fail("\"" + word + "\" is neither a function address nor a row of bytes");
        }
        if (!EndFunction()) {
            return false;
        }
        for (const PciFunctionDump& other : *Functions) {
            if (other.Domain == function.Domain && other.Bus == function.Bus &&
                other.Device == function.Device && other.Function == function.Function) {
                return Fail("function " + word + " appears twice");
            }
        }
        HeaderLine = Number;
        Functions->push_back(function);
        return true;
    }

    bool Row(const std::vector<std::string>& words) {
        if (Functions->empty()) {
            return Fail("configuration bytes before the first function");
        }
        std::string& config = Functions->back().Config;
        const std::optional<uint64_t> offset =
            ParseHex(std::string_view(words[0]).substr(0, words[0].size() - 1));
        if (!offset || *offset != config.size() || config.size() % BYTES_PER_ROW != 0) {
            return Fail("row " + words[0] + " does not continue the bytes at offset " +
                        std::to_string(config.size()));
        }
        if (words.size() < 2 || words.size() - 1 > BYTES_PER_ROW) {
            return Fail("a row holds 1 to 16 bytes");
        }
        for (size_t i = 1; i < words.size(); ++i) {
            const std::optional<uint64_t> byte = ParseHex(words[i]);
            if (words[i].size() != 2 || !byte) {
                return Fail("\"" + words[i] + "\" is not a byte in hexadecimal");
            }
            config.push_back(static_cast<char>(*byte));
        }
        if (config.size() > MAX_CONFIG_BYTES) {
            return Fail("more than 4096 configuration bytes");
        }
        return true;
    }

    bool Detail(std::string_view line) {
        if (Functions->empty()) {
            return Fail("detail line before the first function");
        }
        PciFunctionDump& function = Functions->back();
        constexpr std::string_view DRIVER = "Kernel driver in use:";
        if (line.substr(0, DRIVER.size()) == DRIVER) {
            function.Driver = std::string(Trim(line.substr(DRIVER.size())));
            return true;
        }
        if (line.substr(0, 10) == "Interrupt:" || line.substr(0, 6) == "Flags:") {
            const size_t at = line.find("IRQ ");
            if (at != std::string_view::npos) {
                const std::vector<std::string> words = SplitWords(line.substr(at + 4));
                const std::optional<uint64_t> irq =
                    words.empty() ? std::nullopt : ParseNumber(words[0]);
                if (!irq) {
                    return Fail("unreadable IRQ");
                }
                function.Irq = static_cast<unsigned>(*irq);
            }
            return true;
        }
        int resource = -1;
        if (line.substr(0, 7) == "Region " && line.size() > 8 && line[7] >= '0' && line[7] <= '5') {
            resource = line[7] - '0';
        } else if (line.substr(0, 13) == "Expansion ROM") {
            resource = PCI_ROM_RESOURCE;
        }
        const size_t at = line.find("[size=");
        if (resource >= 0 && at != std::string_view::npos) {
            const size_t end = line.find(']', at);
            const std::optional<uint64_t> size = end == std::string_view::npos
                                                     ? std::nullopt
                                                     : ParseSize(line.substr(at + 6, end - at - 6));
            if (!size) {
                return Fail("unreadable region size");
            }
            function.RegionSizes[resource] = *size;
        }
        return true;
    }

    std::vector<PciFunctionDump>* Functions;
    std::string* Error;
    int Number = 0;
    int HeaderLine = 0;
};

}  // namespace

bool ParseLspciDump(std::string_view text, std::vector<PciFunctionDump>* functions,
                    std::string* error) {
    functions->clear();
    DumpReader reader(functions, error);
    int number = 0;
    for (std::string_view line : SplitLines(text)) {
        if (!reader.Line(++number, line)) {
            return false;
        }
    }
    return reader.Finish();
}

}  // namespace velhsim
