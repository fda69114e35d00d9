/// One fault of each kind that the sanitizers must find, by name; `none` does the same soundly.
// SPDX-License-Identifier: MIT
#include <cstdio>
#include <limits>
#include <string_view>
#include <vector>

namespace {

constexpr int kCount = 1000;

/// Two threads write the same numbers one after the other; `barrier` keeps them apart.
int SumAfterTwoLoops(bool barrier) {
  std::vector<int> numbers(kCount);
  int* const first = numbers.data();
#pragma omp parallel num_threads(2)
  {
#pragma omp for schedule(static) nowait
    for (int i = 0; i < kCount; ++i) first[i] = i;
    if (barrier) {
#pragma omp barrier
    }
#pragma omp for schedule(static)
    for (int i = 0; i < kCount; ++i) first[kCount - 1 - i] += 1;
  }
  int sum = 0;
  for (const int number : numbers) sum += number;
  return sum;
}

/// Hides a value from the optimiser.
template <class T>
T Hidden(T value) {
  volatile T hidden = value;
  return hidden;
}

}  // namespace

int main(int argc, char** argv) {
  const std::string_view fault = argc == 2 ? argv[1] : "";
  const std::vector<int> numbers(4, 7);
  int result = SumAfterTwoLoops(fault != "race");
  result += numbers.data()[Hidden(fault == "overrun" ? 4 : 3)];
  result += static_cast<int>(Hidden(fault == "cast" ? 1e10 : 10.0));
  result ^= Hidden(fault == "overflow" ? std::numeric_limits<int>::max() : 1) + 1;
  const int* kept = new int(result);
  std::printf("%d\n", *kept);
  if (fault != "leak") delete kept;
}
