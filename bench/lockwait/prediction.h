// What a recovery's wait should be, by reckoning.
//
// Checks that all last D begin at random, independent moments, r of them within D on average; r is
// then also the mean number in flight. A recovery that comes at any moment gets the lock at once if
// no check has begun within the last D, and else as soon as D has passed without one beginning: the
// lock prefers readers, so the one that waits keeps nobody out. That is the wait of somebody who
// wants to cross a road between cars. All results are in multiples of D.
#pragma once

// The mean, (e^r - 1) / r - 1.
double meanwait(double inflight);

// The median; 0 while the lock is free in at least half of all moments, up to r = ln 2.
double medianwait(double inflight);
