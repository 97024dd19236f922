// The daemon's messages: the table of all of them, and recognising one. The table is held against
// the daemon's sources by a test, so that no message changes without it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>

#include "instant.h"

namespace report {

// Every message that the daemon writes to its log and to standard error, which the journal mixes
// in. Named for what it says.
enum class messageid : std::uint8_t {
    // Generations: loading, refresh, monitors that start and end.
    kServiceNamed,            // Name of the service being monitored: {NAME}
    kBinaryPathNamed,         // Binary path of service being monitored: {PATH}
    kThreadEntered,           // This is the entry of threadfunc
    kThreadLeft,              // This is the exit of threadfunc
    kThreadCreated,           // Thread id :{TID}thread created...
    kThreadJoined,            // Thread id :{TID}thread is joined...
    kNoTarget,                // Current pointer found NULL
    kRefreshBegins,           // After globalrefresh times refreshconfig,join threadas*
    kBeforeJoin,              // before join......
    kAfterJoin,               // after join......
    kLoadFailed,              // Loadservices error.
    kNoLock,                  // Failed to init the pingreclock.
    kConfigurationUnreadable, // error, unable to open the input file: 0 (standard error)
    kNoLog,                   // Unable to open the log file (standard error)
    kCommandLineRefused,      // the five of a wrong command line (standard error)
    kListing,                 // the listing of the configuration, all its forms

    // The general ping.
    kPingBegins,            // Entering of general ping function, before get read lock.
    kPingAsks,              // enter of general ping, after get read lock.
    kNoStatusFile,          // Unable to open service status file.
    kStatusAnswered,        // command = {COMMAND}, result = {LINE}, state = {STATUS}
    kPingSucceeded,         // General ping successful!
    kPingSucceededByStatus, // General ping successful! state = {STATUS}
    kPingFailed,            // General ping failed!
    kPingUnknown,           // General ping failed no/unrecgnized/unused
    kPingUnclear,           //  General Ping failed other cases.................
    kServiceFailed,  // General ping failed for service {NAME}. Try to general ping more times ...
    kServiceUnknown, // General ping failed for service {NAME}, unrecognized service.
    kRetriesLeft,    // General ping will be tried {N} more time(s)
    kPingRetry,      // Retry the general ping before we take action to recover, ...
    kGeneralPause,   // General ping sleep {SECONDS}

    // The general recovery.
    kRecoveryWaits,  // Entry of general recover before getting write lock
    kRecoveryBegins, // Entry of general recover after getting write lock
    kRecoveryTried,  // Try the general recover for service {NAME}
    kRecoveryStep,   // the stop and start commands and what stands between, all their forms
    kNotConfigured,  // Service not found in the xmlparser::allservices, can not recover.
    kRecoveryEnds,   // Exit of general recover after release write lock
    kRecovered,      // ..., but this service has been general recoverred successfully.
    kGaveUp,         // Failed to general recover the sevice {NAME} after try the max times.

    // The functional ping and recovery.
    kNoCheck,        // No functional ping cmd is provided, skip functional ping part
    kCheckBegins,    // ({PATH}) Executing functional ping now ...
    kCheckAsks,      // Performing functional ping, process id is: {PID}, fp cmd is: {CHECK}
    kNoCheckFile,    //  unable to open service status file.
    kCheckSucceeded, // Functionalping result correct functional ping, ...
    kCheckException, //  Functionalping result wrong functional ping,...
    kCheckNotFound,  // Functional ping failed with return 2, no recover action ...
    kCheckUnclear,   // Functional ping failed with return 3: ...
    kCheckFailed,    // Functionalping failed for service {NAME}. Try to ping more times now, ...
    kCheckNotRecognised,      // Functionalping failed for service {NAME}, unrecognized command.
    kCheckRetry,              // Retry the functionalping before we take action to recover, ...
    kFunctionalPause,         // Functional ping sleep {SECONDS}
    kFunctionalRecoveryTried, // Try the functional recover for service {NAME}
    kFunctionallyRecovered,   // ..., but this service has been successfully functional recovered.
    kFunctionalGaveUp, // Failed to functional recover the sevice {NAME} after try the max times.
                       // ...
    kCheckSkipped,     // ({PATH}) Skipping functional ping. {N} FPs skipped so far.
    kCannotSkip,       // ({PATH}) Can not skip Functional ping now, max skip count reached

    // The process's figures.
    kNoFigures, // ({PATH}) Unable to fetch stats of process from system
    kFigures,   // thresholds and figures, the new process id and the rest, all their forms

    kForeign, // no message of the daemon's
};

// Whether such a message may change what is known of a service's state, of whether anything is
// watched, or of who speaks and whether debug lines are on. All others are steps on the way,
// figures and the listing. Any thread.
constexpr bool matters(messageid id) noexcept
{
    switch (id) {
    case messageid::kThreadCreated:
    case messageid::kListing:
    case messageid::kPingBegins:
    case messageid::kPingAsks:
    case messageid::kNoStatusFile:
    case messageid::kPingFailed:
    case messageid::kPingUnknown:
    case messageid::kPingUnclear:
    case messageid::kRetriesLeft:
    case messageid::kPingRetry:
    case messageid::kGeneralPause:
    case messageid::kRecoveryWaits:
    case messageid::kRecoveryBegins:
    case messageid::kRecoveryStep:
    case messageid::kNotConfigured:
    case messageid::kRecoveryEnds:
    case messageid::kNoCheck:
    case messageid::kCheckAsks:
    case messageid::kNoCheckFile:
    case messageid::kCheckException:
    case messageid::kCheckNotFound:
    case messageid::kCheckUnclear:
    case messageid::kCheckRetry:
    case messageid::kFunctionalPause:
    case messageid::kFigures:
    case messageid::kForeign:
        return false;
    default:
        return true;
    }
}

enum class loglevel : std::uint8_t { kError, kInfo, kDebug, kStandardError };

// One form of a message. Values stand in it as {NAME}; `module` has the blank that two of the
// listing's have behind their name.
struct messageform {
    messageid id;
    loglevel level;
    std::string_view module; // empty for standard error
    std::string_view text;
    std::string_view meaning; // in plain words, for those who list the table
};

// The table of all forms. Any thread.
std::span<const messageform> messageforms() noexcept;

// A message as it is recognised: which, and the values in it. The values are parts of the text that
// was given.
struct recognised {
    messageid id = messageid::kForeign;
    std::string_view first{};  // the first value, a {NAME} or {PATH} mostly; empty without values
    std::string_view second{}; // the second one
};

// Which message `text` is, under `level` and `module`. A value may hold anything, also the words of
// a message. Any thread.
recognised recognise(loglevel level, std::string_view module, std::string_view text) noexcept;

// One message of the log, as the reader hands it on. Its texts live until the listener returns.
struct message {
    messageid id = messageid::kForeign;
    loglevel level = loglevel::kInfo;
    std::uint64_t thread = 0; // 0: standard error has none
    instant when;             // of standard error: the line's before
    std::string_view first{}; // values, see recognised
    std::string_view second{};
    std::string_view text{}; // the whole message
    std::string_view more{}; // the lines that follow it and belong to it, with their newlines
    std::uint64_t line = 0;  // where it stands, counted from 1 over all files
};

} // namespace report
