#pragma once

#include <string>

#include "trelm/String.h"

namespace trelm::test {

// The contents of tests/data/xml/<name>; fails the current test when the file can't be read.
String loadXml(std::string const& name);

}  // namespace trelm::test
