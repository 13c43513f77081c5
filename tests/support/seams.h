/**
 * What a unit test must not really do, it records: a test program defines these functions of the C
 * library itself, so the units call them here. Sleeping only counts; log lines are kept; identity
 * switches are recorded and go through unless a test makes them fail.
 */
#ifndef ZYROVFS_TESTS_SEAMS_H
#define ZYROVFS_TESTS_SEAMS_H

#include <ctime>
#include <functional>
#include <string>
#include <vector>

namespace seams {

/** Forgets all that was recorded and every planned failure. */
void Reset();

/**
 * From now on the records below also hold what forked children do, in the order of time. Until the
 * next Reset.
 */
void WatchChildren();

/** Seconds of each sleep() and microseconds of each usleep(), in order. */
std::vector<unsigned> Sleeps();
std::vector<unsigned> MicroSleeps();

/** CLOCK_MONOTONIC_COARSE goes on by the microseconds of each usleep(), by these, and by nothing
 * else. */
void PassTime(long microseconds);

/** time() answers this from now on, until the next Reset; -1 is a clock that fails. */
void SetTime(time_t now);

/** Called by each usleep() or sleep(), for a test in which something happens during a wait. */
void OnMicroSleep(std::function<void()> hook);
void OnSleep(std::function<void()> hook);

struct LogLine {
    int priority;
    std::string text;  ///< whole line, "unit.cpp:12 Failed to ..."
};
std::vector<LogLine> LogLines();

/** True when some line's text, behind its "unit.cpp:12 ", equals `text`. */
bool Logged(const std::string& text);
/** True when some line contains `part`. */
bool LoggedPart(const std::string& part);
/** All lines, for the message of a failed expectation. */
std::string LogDump();

/** Identity calls in order, as "setresuid(-1, 0, -1)". */
std::vector<std::string> IdentityCalls();
/**
 * Calls of this function ("setresuid", "setresgid", "seteuid", "setegid", "setregid", "setreuid"),
 * or this very call ("setreuid(0, 0)"), fail with `error` from now on, the first `after` of them
 * excepted.
 */
void FailIdentity(const std::string& function, int error, int after = 0);
/** Identity calls are recorded and answered with success, but change nothing. */
void PretendIdentity(bool on);

}  // namespace seams

#endif
