// The test spy backend of the substitute DVB service.
//
// Every module operation is recorded with its arguments and the exact bytes of every record
// passed in, and answered from a script: a result per operation (0 unless scripted), byte
// patches written into its out-records, and node lists for the scan results. The script
// stays in force until reset() or until it is scripted again. All functions are thread-safe.
#pragma once

#include <DVB.h>
#include <nativehelper/jni.h>

#include <cstdint>
#include <string>
#include <vector>

#include "../Service.h"

namespace dvbspy {

struct Call {
    std::string op;                             // "Cfg::Tune"
    const android::DVB* owner;                  // the DVB object whose module was called
    std::vector<int64_t> args;                  // every argument; a pointer argument as 0
    std::vector<std::vector<uint8_t>> records;  // bytes behind each pointer argument, on entry
};

dvbsvc::Backend& backend();

// Forgets every call and every script, and includes every module again.
void reset();

std::vector<Call> calls();
size_t callCount();

// Leaves the named modules ("Scnm", "Strm", "Cfg", "Subttl", "Teltxt") out of the DVB objects
// created from now on.
void omitModules(const std::vector<std::string>& modules);

void setResult(const std::string& op, int32_t result);

// After each call of `op`, `bytes` are written at `offset` into its pointer argument number
// `arg` (0-based over all of the operation's arguments).
void setOut(const std::string& op, int arg, size_t offset, const std::vector<uint8_t>& bytes);

// The list that Scnm::CreateServiceList or Scnm::CreateNetworkList hands out next: each node
// given whole (124 or 96 bytes); the spy writes the links.
void setList(const std::string& op, const std::vector<std::vector<uint8_t>>& nodes);

// Teltxt::GetData writes byte (offset + i) of this stream: a fixed pattern tests can predict.
inline uint8_t teletextByte(int64_t position) {
    return static_cast<uint8_t>((position * 31 + 7) ^ (position >> 8));
}

// Delivers `count` events (msg, ext1, ext2) to every live DVB object's listener from each of
// `threads` native threads, attached to the Java VM as the service's threads are, and waits
// for them.
void raiseEvents(int msg, int ext1, int ext2, int count, int threads);

// In quiet mode every operation answers 0 at once: nothing is recorded, scripted or written.
// Benchmarks use it to measure the library's own cost.
void setQuiet(bool quiet);

// Called with the environment of every service thread right after it attaches.
void setAttachHook(void (*hook)(JNIEnv*));

}  // namespace dvbspy
