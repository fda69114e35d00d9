/// A program that embeds the library: it names a method and looks for a file.
// SPDX-License-Identifier: MIT
#include <iostream>

#include "processes/overviews/createoverviews.h"

int main() {
  CreateFileOverviews job("no-such-file.tif");
  job.SetPyramidType(GetPyramidType("average"));
  std::cout << "method " << GetPyramidType("average") << ", file " << job.FileExists() << '\n';
}
