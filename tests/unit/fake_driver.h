// A slot driver behind the ioctl seam: answers the version and table requests from its fields,
// fails a chosen request with EIO, and records what it was sent.
#pragma once

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <vector>

#include "util/sysaccess.h"
#include "velhpdrv.h"

struct FakeDriver {
    _VELH_VERSION Version{1, 0, 0};
    std::vector<uint8_t> Table;  // its size answers the size request
    uint32_t DeliveredSize = 0;  // size answered after the table request; 0: the buffer's size
    unsigned long FailRequest = 0;
    std::vector<unsigned long> Requests;

    // Makes this the driver behind SysCalls().Ioctl.
    void Install() {
        Current() = this;
        SysCalls().Ioctl = Ioctl;
    }
    // A table of `size` bytes that differ from their neighbours.
    void SetTable(uint32_t size) {
        Table.resize(size);
        for (uint32_t i = 0; i < size; ++i) {
            Table[i] = static_cast<uint8_t>(i * 7 + 3);
        }
    }
    size_t Count(unsigned long request) const {
        return static_cast<size_t>(std::count(Requests.begin(), Requests.end(), request));
    }

  private:
    static FakeDriver*& Current() {
        static FakeDriver* current = nullptr;
        return current;
    }
    static int Ioctl(int, unsigned long request, void* argument) {
        FakeDriver& driver = *Current();
        driver.Requests.push_back(request);
        auto* transfer = static_cast<_VELH_TABLE_XFER*>(argument);
        if (request == driver.FailRequest) {
            errno = EIO;
            return -1;
        }
        if (request == VELH_IOCTL_VERSION) {
            *static_cast<_VELH_VERSION*>(argument) = driver.Version;
        } else if (request == VELH_IOCTL_TABLE_SIZE) {
            transfer->Size = static_cast<uint32_t>(driver.Table.size());
        } else if (request == VELH_IOCTL_TABLE) {
            // Fills no more than the buffer it was given, then reports its own size.
            std::memcpy(transfer->Buffer, driver.Table.data(),
                        std::min<size_t>(transfer->Size, driver.Table.size()));
            transfer->Size = driver.DeliveredSize != 0 ? driver.DeliveredSize : transfer->Size;
        } else {
            errno = EINVAL;
            return -1;
        }
        return 0;
    }
};
