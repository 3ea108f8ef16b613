#include "run/memory.hpp"

#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <string>

#include "run/messages.hpp"

uint64_t MachineMemoryBytes() {
    const long pages = sysconf(_SC_PHYS_PAGES);
    const long pageSize = sysconf(_SC_PAGE_SIZE);
    uint64_t bytes = pages > 0 && pageSize > 0
                         ? static_cast<uint64_t>(pages) * static_cast<uint64_t>(pageSize)
                         : UINT64_MAX;
    for (const int resource : {RLIMIT_AS, RLIMIT_DATA}) {
        rlimit limit{};
        if (getrlimit(resource, &limit) == 0 && limit.rlim_cur != RLIM_INFINITY)
            bytes = std::min<uint64_t>(bytes, limit.rlim_cur);
    }
    return bytes;
}

void CheckMemory(std::string_view what, double count, double itemBytes) {
    const double need = count * itemBytes;
    const double have = static_cast<double>(MachineMemoryBytes());
    if (!(need > have)) return;  // a count below 0 is the caller's to refuse
    char text[160];
    std::snprintf(text, sizeof text, " needs %.3g GB, the machine has %.3g GB", need / 1e9,
                  have / 1e9);
    StopRun("Unable to allocate memory: " + std::string(what) + text);
}
