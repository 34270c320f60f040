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

std::string ResolveList(const std::string& list, const std::string& origin,
                        const std::string& install) {
    std::string resolved;
    size_t start = 0;
    for (;;) {
        const size_t colon = list.find(':', start);
        resolved += ResolvePart(list.substr(start, colon - start), origin, install);
        if (colon == std::string::npos) {
            return resolved;
        }
        resolved += ':';
        start = colon + 1;
    }
}

}  // namespace

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
        if (equals != std::string::npos) {
            resolved.push_back(argument.substr(0, equals + 1) +
                               ResolveList(argument.substr(equals + 1), origin, install));
        } else {
            resolved.push_back(ResolveList(argument, origin, install));
        }
    }
    return resolved;
}

}  // namespace velhsim
