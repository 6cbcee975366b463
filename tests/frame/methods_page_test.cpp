#include "frame/methods_page.h"

#include <gtest/gtest.h>

#include <fstream>
#include <sstream>

namespace zor {
namespace {

// Catches a row that was added, lost, moved or reworded without anybody looking at it.
TEST(MethodsPage, IsWhatTheTablesSay) {
  std::ifstream file(PICTUREZOR_SOURCE_DIR "/docs/methods.md");
  std::ostringstream page;
  page << file.rdbuf();
  EXPECT_EQ(page.str(), MethodsPage()) << "run scripts/methods and look at what changed";
}

}
}
