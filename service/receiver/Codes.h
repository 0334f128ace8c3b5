// The emulated receiver's codes: the meanings it gives to the words that the service interface
// leaves to the service (README "Receiver" lists them all). Module operations answer 0 or a
// positive handle on success and one of the negative results below on failure; none of them is
// -1, which Java reads as the library's own failure.
#pragma once

#include <cstdint>

namespace dvbrx {

// Results of module operations (and the `result` words of the status records).
enum Result : int32_t {
    kOk = 0,
    kErrBadHandle = -2,     // unknown handle, or one used after Close/Stop
    kErrBadParameter = -3,  // out-of-range value, negative count, null record
    kErrBusy = -4,          // the front end or scan is in use
    kErrNoSignal = -5,      // the tuning selects no transponder
    kErrNoService = -6,     // the tuned transponder does not carry the service
    kErrNotStarted = -7,    // the stream or scan has not been started
    kErrPath = -8,          // a path that cannot be read or written
    kErrNotSupported = -9,  // not offered by this receiver (yet)
    kErrNoData = -10,       // nothing to deliver now
    kErrTooMany = -11,      // no free handle
    kErrNoComponent = -12,  // the service has no component with that PID
    kErrDatabase = -13,     // the event database cannot be opened or written
};

// Listener events raised by the receiver (msg, ext1, ext2).
enum EventCode : int {
    kEvtScanProgress = 200,  // scan handle, percent done (0..100)
    kEvtScanComplete = 201,  // scan handle, services found
    kEvtLock = 210,          // front end, 1 locked / 0 lock lost
    kEvtPositioner = 211,    // front end, dish position reached (tenths of a degree)
    kEvtPresent = 220,       // stream handle, id of the new present event
    kEvtSystemReady = 230,   // 0 or a Result, 0
    kEvtSubtitle = 240,      // subtitle decoder handle, regions of the new display set
    kEvtTeletext = 250,      // teletext decoder handle, page << 16 | subcode of the new sending
    kEvtEpgUpdate = 260,     // service id, events stored (or kErrDatabase)
};

// Front-end type codes of ANT_FrontendParameters.type.
enum FrontendType : int32_t { kSatellite = 0, kCable = 1, kTerrestrial = 2 };

// Front-end status word: the bits of a demodulator as Linux DVB reports them.
enum FeStatus : int32_t {
    kFeSignal = 0x01,
    kFeCarrier = 0x02,
    kFeViterbi = 0x04,
    kFeSync = 0x08,
    kFeLock = 0x10,
    kFeTimedOut = 0x20,
};

// DiSEqC setting of ANT_FrontendParameters.diseqctype.
enum Diseqc : int32_t { kFixedDish = 0, kSwitch = 1, kMotor = 2, kUsals = 3 };

// 22 kHz tone setting: off (low band), on (high band), or chosen by the frequency.
enum Tone : uint8_t { kToneOff = 0, kToneOn = 1, kToneAuto = 2 };

// Scan types of SCNM_StartSettings.scanType.
enum ScanType : int32_t { kScanSingle = 0, kScanNetwork = 1, kScanFullBand = 2 };

// Scan states, in SCNM_GetStatus.result.
enum ScanState : int32_t { kScanIdle = 0, kScanRunning = 1, kScanDone = 2, kScanStopped = 3 };

// Picture status of STRM_GetStatus.
enum Picture : int32_t { kNoPicture = 0, kDecoding = 1, kFrozen = 2, kScrambled = 3 };

// Recording and playback states of STRM_GetStatus.
enum PvrState : int32_t { kPvrIdle = 0, kPvrActive = 1, kPvrPaused = 2, kPvrTrick = 3 };

}  // namespace dvbrx
