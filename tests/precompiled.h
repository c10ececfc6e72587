// SPDX-License-Identifier: Apache-2.0
/// @file
/// The headers that nearly every test includes, compiled once. Every file still includes what it uses: with
/// -D CMAKE_DISABLE_PRECOMPILE_HEADERS=ON the tests build without this header. Headers that only a few files need are
/// not here, because each one makes every compilation start more slowly.

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
