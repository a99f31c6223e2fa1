#pragma once

#include <cstddef>

// This program's own operator new: it counts, and can fail once.
namespace tests {

// From here on allocations of this process are counted from 1, and the given one fails with std::bad_alloc; 0 is none.
void beginScarcity(std::size_t failingAllocation);
// From here on none is counted. Answers how many there were.
std::size_t endScarcity();

}  // namespace tests
