#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace test_support {

/// The content of an accessor. A matrix stands column by column, without padding; normalised
/// integers are scaled to 0..1 or -1..1.
struct AccessorValues {
    int componentType = 0;
    size_t components = 0;
    size_t count = 0;
    std::vector<double> values;

    /// The `components` values of element `index`.
    const double* at(size_t index) const { return values.data() + index * components; }
};

} // namespace test_support
