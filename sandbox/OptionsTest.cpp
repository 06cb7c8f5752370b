#include <gtest/gtest.h>

#include <vector>

#include "sandbox/Options.h"

namespace sandbox {

TEST(OptionsTest, ReadsEveryOption) {
  const std::vector<const char*> arguments = {"--state",   "/s",      "--port=8443", "--port-file",
                                              "/p",        "--quiet", "--data-from", "/d",
                                              "--threads", "3",       "--background"};
  const auto options = parseOptions(arguments);
  ASSERT_TRUE(options);
  EXPECT_EQ(options->state, "/s");
  EXPECT_EQ(options->port, 8443);
  EXPECT_EQ(options->portFile, "/p");
  EXPECT_EQ(options->dataRoot, "/d");
  EXPECT_EQ(options->threads, 3U);
  EXPECT_TRUE(options->quiet);
  EXPECT_TRUE(options->background);
}

TEST(OptionsTest, RefusesWhatItDoesNotUnderstand) {
  for (const std::vector<const char*>& arguments :
       std::initializer_list<std::vector<const char*>>{{},
                                                       {"--state"},
                                                       {"--state", ""},
                                                       {"--state", "/s", "--port", "65536"},
                                                       {"--state", "/s", "--port", "-1"},
                                                       {"--state", "/s", "--port", "80x"},
                                                       {"--state", "/s", "extra"},
                                                       {"--state", "/s", "--quiet=no"},
                                                       {"--stat", "/s"}}) {
    EXPECT_FALSE(parseOptions(arguments));
  }
  for (const auto* option : {"--help", "-h", "--version"}) {
    EXPECT_TRUE(parseOptions(std::vector<const char*>{option})) << option;
  }
}

}  // namespace sandbox
