#pragma once

#include <optional>
#include <string>

#include "program/commands/collect.h"

// A worker is a process that collects from one controller for another process of this program. It
// reads what it is to do, secrets included, from standard input, so that they stand neither
// in its arguments nor in its environment; writes the report to standard output and its log lines
// to standard error; and in the end says on a further descriptor how it went. Either message is one
// CBOR object (RFC 8949): neither passwords nor names of files need be UTF-8.

namespace ipmisel {

/// Where a worker says how it went.
inline constexpr int kWorkerResult = 3;
/// Neither message is longer.
inline constexpr std::size_t kMaxWorkerMessage = 1 << 16;

/// The collection from one source as a message to a worker.
std::string WriteWorkerRequest(const CollectOptions& options);

/// How a collection went, as a worker says it.
struct WorkerResult {
    Outcome outcome;
    bool reported = false;  ///< the report is whole; else the problem is all there is
};
std::string WriteWorkerResult(const WorkerResult& result);
/// Empty when it is no such message.
std::optional<WorkerResult> ParseWorkerResult(const std::string& message);

/// What is told of a worker that had not memory enough. One that cannot say so ends with
/// kExitNoSource and no result.
Outcome OutOfMemoryOfAWorker();
/// The work itself, to be run in a process of its own; the exit status. Log lines stand under the
/// name. Throws Failure.
int RunWorker(const std::string& name);
/// Loads what all workers of a collection need, as far as it can be; they tell what cannot.
void PrepareWorkers(const CollectOptions& options);

}  // namespace ipmisel
