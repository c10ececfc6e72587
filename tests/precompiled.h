// SPDX-License-Identifier: Apache-2.0
/// @file
/// What nearly every test includes, read by the compiler once. Every file still includes what it uses: with
/// -D CMAKE_DISABLE_PRECOMPILE_HEADERS=ON the tests build without this one. What only a few files need is not here, since
/// each header makes the compiler start later on all of them.

#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <stdexcept>
#include <string>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>
