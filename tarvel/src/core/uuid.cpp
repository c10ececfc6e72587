// SPDX-License-Identifier: Apache-2.0

#include <tarvel/core/exception.h>
#include <tarvel/core/string_util.h>

#include "core/current_environment.h"

#include <boost/uuid/entropy_error.hpp>
#include <boost/uuid/random_generator.hpp>
#include <boost/uuid/uuid_io.hpp>

namespace Tarvel {

std::string StringUtil::GenerateUuid() {
  const Environment *const environment = CurrentEnvironment();
  if (environment && environment->uuid) {
    return environment->uuid();
  }
  try {
    boost::uuids::random_generator_pure generate;
    return boost::uuids::to_string(generate());
  } catch (const boost::uuids::entropy_error &error) {
    throw Exception("The system's random source failed: " + std::string(error.what()));
  }
}

} // namespace Tarvel
