#pragma once

#include <chrono>

/// This process kills itself when it is about to do something for the n-th time that lasts: to have a file
/// written out, renamed or removed. 0: it does not.
void dieAtStep(int number);
/// How many of them this process has done so far.
int stepsDone();
/// From now on the time of day is so much later for this process, or earlier.
void moveTimeOfDay(long seconds);
/// So much of the host's time since its start passes at once for this process.
void passTime(std::chrono::milliseconds time);
