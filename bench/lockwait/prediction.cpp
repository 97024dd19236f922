// What a recovery's wait should be, by reckoning.
#include "prediction.h"

#include <cmath>
#include <vector>

namespace {

constexpr int kStepsPerCheck = 1000;

} // namespace

double meanwait(double inflight)
{
    return std::expm1(inflight) / inflight - 1;
}

// S(t), the chance of a wait longer than t: before 0 it is 1, at 0 it falls to 1 - e^-r. A wait
// ends at t when a check begins at t - D, with the recovery still waiting there, and no other
// within the D that follows: S'(t) = -r e^-r S(t - 1). Followed here in small steps until it is a
// half.
double medianwait(double inflight)
{
    const double ending = inflight * std::exp(-inflight) / kStepsPerCheck;
    std::vector<double> waiting{-std::expm1(-inflight)};
    while (waiting.back() > 0.5) {
        const std::size_t step = waiting.size();
        const double before = step <= kStepsPerCheck ? 1.0 : waiting[step - kStepsPerCheck - 1];
        waiting.push_back(waiting.back() - ending * before);
    }
    return static_cast<double>(waiting.size() - 1) / kStepsPerCheck;
}
