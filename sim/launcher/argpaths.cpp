#include "sim/launcher/argpaths.h"

#include <sys/stat.h>

#include "sim/common/textfile.h"

namespace velhsim {

namespace {

bool Exists(const std::string& path) {
    struct stat info {};
    return lstat(path.c_str(), &info) == 0;
}

std::string ResolvePart(const std::string& part, const std::string& origin,
                        const std::string& install) {
    if (part.empty() || part.front() == '/' || part.front() == '-' ||
        !Exists(JoinPath(origin, part)) || Exists(JoinPath(install, part))) {
        return part;
    }
    return JoinPath(origin, part);
}

// The parts of an argument: itself, or the text after its first "=", split at ":".
std::vector<std::string> Parts(const std::string& argument) {
    const size_t equals = argument.find('=');
    const std::string list = equals == std::string::npos ? argument : argument.substr(equals + 1);
    std::vector<std::string> parts;
    size_t start = 0;
    for (size_t colon = list.find(':'); colon != std::string::npos; colon = list.find(':', start)) {
        parts.push_back(list.substr(start, colon - start));
        start = colon + 1;
    }
    parts.push_back(list.substr(start));
    return parts;
}

}  // namespace

std::vector<std::string> ExistingAbsolutePaths(const std::vector<std::string>& command) {
    std::vector<std::string> paths;
    for (const std::string& argument : command) {
        for (const std::string& part : Parts(argument)) {
            if (!part.empty() && part.front() == '/' && Exists(part)) {
                paths.push_back(part);
            }
        }
    }
    return paths;
}

std::vector<std::string> ResolveArguments(const std::vector<std::string>& command,
                                          const std::string& origin, const std::string& install) {
    std::vector<std::string> resolved;
    for (size_t i = 0; i < command.size(); ++i) {
        const std::string& argument = command[i];
        if (i == 0 && argument.find('/') == std::string::npos) {
            resolved.push_back(argument);
            continue;
        }
        const size_t equals = argument.find('=');
        std::string joined = equals == std::string::npos ? "" : argument.substr(0, equals + 1);
        const std::vector<std::string> parts = Parts(argument);
        for (size_t p = 0; p < parts.size(); ++p) {
            joined += (p > 0 ? ":" : "") + ResolvePart(parts[p], origin, install);
        }
        resolved.push_back(joined);
    }
    return resolved;
}

}  // namespace velhsim
