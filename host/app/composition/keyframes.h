// Animatable values: a constant, or keyframes evaluated at any time in seconds.
#pragma once

#include <algorithm>
#include <array>
#include <cstddef>
#include <utility>
#include <vector>

namespace ostrel {

template <size_t N>
using Vec = std::array<double, N>;

// How a value travels from a keyframe to the next one.
enum class Interpolation {
    kLinear,
    kHold,  // keeps the key's value until the next key
    kEase,  // leaves and arrives with zero speed: u' = u²(3 − 2u)
};

template <size_t N>
struct Keyframe {
    double time = 0;  // seconds
    Vec<N> value{};
    Interpolation out = Interpolation::kLinear;  // towards the next key
};

template <size_t N>
class Animated {
public:
    Animated() : Animated(Vec<N>{}) {}
    Animated(Vec<N> constant) : keys_{{0.0, constant, Interpolation::kHold}} {}
    // Keys in strictly increasing time, at least one (the loader guarantees both).
    explicit Animated(std::vector<Keyframe<N>> keys) : keys_(std::move(keys)) {}

    // Before the first key the first value holds, after the last key the last one.
    Vec<N> At(double seconds) const {
        if (seconds <= keys_.front().time) return keys_.front().value;
        if (seconds >= keys_.back().time) return keys_.back().value;
        auto next = std::upper_bound(keys_.begin(), keys_.end(), seconds,
                                     [](double t, const Keyframe<N>& key) { return t < key.time; });
        const Keyframe<N>& a = *(next - 1);
        const Keyframe<N>& b = *next;
        if (a.out == Interpolation::kHold) return a.value;
        double u = (seconds - a.time) / (b.time - a.time);
        if (a.out == Interpolation::kEase) u = u * u * (3.0 - 2.0 * u);
        Vec<N> value;
        for (size_t i = 0; i < N; ++i)
            value[i] = a.value[i] + (b.value[i] - a.value[i]) * u;
        return value;
    }

    double ValueAt(double seconds) const requires(N == 1) { return At(seconds)[0]; }

    bool IsAnimated() const { return keys_.size() > 1; }
    const std::vector<Keyframe<N>>& Keys() const { return keys_; }

private:
    std::vector<Keyframe<N>> keys_;
};

using Scalar = Animated<1>;
using Vector3 = Animated<3>;

}  // namespace ostrel
