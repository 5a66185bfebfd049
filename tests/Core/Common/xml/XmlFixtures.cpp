#include "XmlFixtures.h"

#include <gtest/gtest.h>

#include <fstream>
#include <sstream>

namespace trelm::test {

String loadXml(std::string const& name) {
    std::string path = std::string(TRELM_TEST_DATA_DIR) + "/xml/" + name;
    std::ifstream in(path, std::ios::binary);
    EXPECT_TRUE(in.good()) << "cannot read " << path;
    std::ostringstream text;
    text << in.rdbuf();
    return String(text.str());
}

}  // namespace trelm::test
