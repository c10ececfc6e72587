// SPDX-License-Identifier: Apache-2.0
/// @file
/// What nearly every test includes, read by the compiler once. Every file still includes what it uses: with
/// -D CMAKE_DISABLE_PRECOMPILE_HEADERS=ON the tests build without this one.

#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <exception>
#include <filesystem>
#include <fstream>
#include <functional>
#include <future>
#include <iterator>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <sstream>
#include <stdexcept>
#include <string>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>
