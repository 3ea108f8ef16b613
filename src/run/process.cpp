#include "run/process.hpp"

#include <mpi.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <new>

#include "run/messages.hpp"
#include "run/threads.hpp"

ProcessState gProcess;

namespace {

// Every call of message passing goes through here: a non-zero result stops
// the run with the library's own text.
void CheckMpi(int result) {
    if (result == MPI_SUCCESS) return;
    char text[MPI_MAX_ERROR_STRING + 1] = {};
    int length = 0;
    MPI_Error_string(result, text, &length);
    ReportFatal(text);
}

// True when a launcher started this process: only then is message passing
// brought up, so that a run started alone never waits on a runtime it doesn't need.
bool StartedByLauncher() {
    for (const char* name : {"OMPI_COMM_WORLD_SIZE", "PMIX_RANK", "PMI_RANK", "PMI_SIZE"})
        if (std::getenv(name) != nullptr) return true;
    return false;
}

std::string HostName() {
    char name[256] = {};
    if (gethostname(name, sizeof name - 1) != 0) return "localhost";
    return name;
}

// Gathers the host names on process 0 and groups equal names into machines.
void GatherMachines() {
    const int count = gProcess.processCount;
    int length = static_cast<int>(gProcess.processorName.size());
    std::vector<int> lengths(count, 0);
    CheckMpi(MPI_Gather(&length, 1, MPI_INT, lengths.data(), 1, MPI_INT, 0, MPI_COMM_WORLD));

    std::vector<MPI_Request> requests;
    std::vector<std::string> names;
    if (gProcess.processId == 0) {
        names.resize(count);
        requests.resize(count);
        for (int p = 0; p < count; ++p) {
            names[p].assign(lengths[p], '\0');
            CheckMpi(MPI_Irecv(names[p].data(), lengths[p], MPI_CHAR, p, 17, MPI_COMM_WORLD,
                               &requests[p]));
        }
    }
    MPI_Request send;
    CheckMpi(
        MPI_Isend(gProcess.processorName.data(), length, MPI_CHAR, 0, 17, MPI_COMM_WORLD, &send));
    if (gProcess.processId == 0) {
        int* status = AllocateMPIStatus(count);
        CheckMpi(MPI_Waitall(count, requests.data(), reinterpret_cast<MPI_Status*>(status)));
        DeallocateMPIStatus(status);
    }
    CheckMpi(MPI_Wait(&send, MPI_STATUS_IGNORE));

    if (gProcess.processId != 0) return;
    gProcess.machineNames.clear();
    gProcess.machineProcesses.clear();
    gProcess.processMachine.assign(count, 0);
    for (int p = 0; p < count; ++p) {
        int machine = -1;
        for (size_t m = 0; m < gProcess.machineNames.size(); ++m)
            if (gProcess.machineNames[m] == names[p]) machine = static_cast<int>(m);
        if (machine < 0) {
            machine = static_cast<int>(gProcess.machineNames.size());
            gProcess.machineNames.push_back(names[p]);
            gProcess.machineProcesses.push_back(0);
        }
        gProcess.processMachine[p] = machine;
        ++gProcess.machineProcesses[machine];
    }
    gProcess.machineCount = static_cast<int>(gProcess.machineNames.size());
}

// The processes of the run that share this machine's memory, this one included.
int LocalProcesses() {
    MPI_Comm local;
    if (MPI_Comm_split_type(MPI_COMM_WORLD, MPI_COMM_TYPE_SHARED, 0, MPI_INFO_NULL, &local) !=
        MPI_SUCCESS)
        return 1;
    int size = 1;
    MPI_Comm_size(local, &size);
    MPI_Comm_free(&local);
    return std::max(size, 1);
}

}  // namespace

void ProcessStart() {
    gProcess.processId = -1;
    gProcess.processCount = 1;
    gProcess.machineCount = 1;
    gProcess.processorName = HostName();
    gProcess.mpiActive = false;

    int provided = 0;
    if (StartedByLauncher() &&
        MPI_Init_thread(nullptr, nullptr, MPI_THREAD_FUNNELED, &provided) == MPI_SUCCESS) {
        gProcess.mpiActive = true;
        MPI_Comm_set_errhandler(MPI_COMM_WORLD, MPI_ERRORS_RETURN);
        char name[MPI_MAX_PROCESSOR_NAME + 1] = {};
        int length = 0;
        CheckMpi(MPI_Get_processor_name(name, &length));
        gProcess.processorName.assign(name, length);
        CheckMpi(MPI_Comm_rank(MPI_COMM_WORLD, &gProcess.processId));
        CheckMpi(MPI_Comm_size(MPI_COMM_WORLD, &gProcess.processCount));
        if (gProcess.processCount == 1)
            gProcess.processId = -1;
        else
            GatherMachines();
    }
    if (gProcess.machineNames.empty() && gProcess.processId <= 0) {
        gProcess.machineNames = {gProcess.processorName};
        gProcess.machineProcesses = {gProcess.processCount};
        gProcess.processMachine.assign(gProcess.processCount, 0);
    }

    gProcess.processorCount = omp_get_num_procs();
    gProcess.maxThreads = omp_get_max_threads();
    gProcess.threadCount = 1;
    gProcess.threadReason.clear();
    gProcess.onlineProcessors = std::max(1, static_cast<int>(sysconf(_SC_NPROCESSORS_ONLN)));
    gProcess.localProcessCount = gProcess.mpiActive ? LocalProcesses() : 1;
    omp_init_lock(&gProcess.threadLock);

    NoteThreadStart();
}

void ProcessFinish() {
    if (!gProcess.mpiActive) return;
    CheckMpi(MPI_Barrier(MPI_COMM_WORLD));
    MPI_Finalize();
    gProcess.mpiActive = false;
}

void SetThreads(int wanted) {
    if (wanted == 0 || wanted == -1) wanted = gProcess.processorCount;
    int count = std::min(wanted, std::min(gProcess.maxThreads, gProcess.processorCount));
    gProcess.threadCount = std::max(count, 1);
    omp_set_num_threads(gProcess.threadCount);
}

void WriteComputingEnvironment() {
    WriteBlockHeading("Computing Environment");
    WriteLabelled("Local processor name : %", gProcess.processorName);
    WriteLabelled("Number of processes  : %", gProcess.processCount);
    WriteLabelled("Local process id     : %", gProcess.processId);
    WriteLabelled("Number of processors : %", gProcess.processorCount);
    WriteLabelled("Max number of threads: %", gProcess.maxThreads);
    if (gProcess.machineCount > 1 && gProcess.processId == 0) {
        WriteLabelled("Number of machines   : %", gProcess.machineCount);
        for (int m = 0; m < gProcess.machineCount; ++m) {
            const std::string number = std::to_string(m + 1);
            std::string line = "Machine";
            line.resize(20 - number.size(), ' ');
            line += "#" + number + ": " + gProcess.machineNames[m] + " (" +
                    std::to_string(gProcess.machineProcesses[m]) + ")";
            WriteLine("  " + line);
        }
    }
    // How the thread count will be chosen once the grid is known, and how
    // waiting threads wait.
    const int requested = RequestedThreads(std::getenv("OMP_NUM_THREADS"));
    WriteLabelled("Threads requested    : %",
                  requested > 0 ? std::to_string(requested) + " (OMP_NUM_THREADS)"
                                : std::string("by grid size and idle processors"));
    WriteLabelled("Waiting threads      : %", WaitingThreadsText());
    WriteBlockHeading("");
}

void WritePerformance() {
    WriteBlockHeading("Performance");
    WriteLabelled("Number of threads: %", gProcess.threadCount);
    WriteBlockHeading("");
}

int* AllocateMPIStatus(int count) {
    // Five integers a request, or more where this MPI's status record is larger.
    constexpr size_t kInts =
        std::max<size_t>(5, (sizeof(MPI_Status) + sizeof(int) - 1) / sizeof(int));
    int* status = new (std::nothrow) int[kInts * static_cast<size_t>(count > 0 ? count : 1)];
    if (status == nullptr) ReportFatal("AllocateMPIStatus: Can't allocate memory");
    return status;
}

void DeallocateMPIStatus(int* status) {
    delete[] status;
}

std::string ProcessFileStem(std::string_view stem) {
    std::string result(stem);
    if (gProcess.processCount > 1) result += "_p" + std::to_string(gProcess.processId);
    return result;
}
