// SPDX-License-Identifier: Apache-2.0
#include "model/namespaces.h"
