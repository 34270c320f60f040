// The agent statistics record: the agent's version and the outcome of its prerequisite checks.
#pragma once

#include <cstdint>
#include <string>

struct _AgentStats {
    std::wstring AgentVersion;
    uint32_t PreReqError = 0;
};
