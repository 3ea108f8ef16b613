// Output files of a running engine are locked against a second run that
// would write the same names, as two models in one folder do: beside each
// output stands "<file>.lock", which holds the process id and the host of
// its writer and carries an advisory lock of the operating system. The
// system drops that lock however the process ends, so a lock file left by a
// killed run is recognised as stale and taken over. The lock files of a run
// are removed at each of its ends that pass through the message layer: the
// last step, a cancel, a blow-up, a fatal stop and a signal.
#pragma once

#include <string>
#include <string_view>

// Takes the lock of an output file before it is created. Stops the run with
// the routine's name, the file and the reason when another running engine
// holds it, or when this run already writes that file through another output.
void LockOutputFile(std::string_view routine, const std::string& path);
// Removes the lock file of one output, once the output is closed; a file
// that holds no lock of this run is passed over.
void UnlockOutputFile(const std::string& path);
// Removes the lock files of this run and drops their locks.
void ReleaseOutputLocks();
