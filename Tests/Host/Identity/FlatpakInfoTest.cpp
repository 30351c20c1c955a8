#include "Host/Identity/FlatpakInfo.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "Host/Identity/IdentityError.h"

namespace palisade {
namespace {

using std::string_literals::operator""s;

TEST(AFlatpakInstanceFile, NamesTheApplication) {
  EXPECT_EQ(flatpakApplicationID("[Application]\n"
                                 "name=org.example.Photos\n"
                                 "runtime=runtime/org.example.Platform/x86_64/3\n"
                                 "\n"
                                 "[Instance]\n"
                                 "instance-id=1234\n"
                                 "name=org.example.Other\n"
                                 "[Session Bus Policy]\n"
                                 "org.example.Photos=own\n"),
            "org.example.Photos");
}

TEST(AFlatpakInstanceFile, RefusesWhenItDoesNotNameAnApplication) {
  const std::vector<std::string> files = {"",
                                          "\n",
                                          "[Application]\n",
                                          "name=org.example.Photos\n",
                                          "[Runtime]\nname=org.example.Platform\n",
                                          "[Instance]\nname=org.example.Photos\n",
                                          "[Application]\nname=\n",
                                          "[Application]\nname=photos\n",
                                          "[Application]\nname=/usr/bin/photos\n",
                                          "[Application]\nname=org.example.Photos\nname=org.example.Other\n",
                                          "[Application]\nname=org.example.Photos\n[Application]\n",
                                          "[Application]\nname=org.example.Photos\0.Other\n"s,
                                          "[Application]\nname=org.example.Photos\nno key\n",
                                          "[Application\nname=org.example.Photos\n",
                                          "[Application]\nname=org..Photos\n",
                                          "[Application]\nname=org.example.Photos;org.example.Other\n",
                                          "[Application]\nname=org.example.Ph\xc3\xb6tos\n",
                                          "[Application]\nname[de]=org.example.Photos\n",
                                          "[Application]\nname=org.example." + std::string(300, 'P') + "\n"};
  for (const std::string& file : files) EXPECT_THROW(flatpakApplicationID(file), IdentityError) << file;
}

TEST(AFlatpakInstanceFile, NamesTheWholeApplicationOrNoneHoweverItIsCutOff) {
  const std::string file = "[Application]\nname=org.example.Photos\n[Instance]\ninstance-id=1\n";
  const std::size_t nameIsComplete = file.find("\n[Instance]");
  for (std::size_t length = 0; length < nameIsComplete; ++length) {
    try {
      // What the kernel hands out is never cut off; a shorter ID would be another application's.
      EXPECT_THAT("org.example.Photos", testing::StartsWith(flatpakApplicationID(file.substr(0, length))));
    } catch (const IdentityError&) {
    }
  }
  for (std::size_t length = nameIsComplete; length <= file.size(); ++length) {
    try {
      EXPECT_EQ(flatpakApplicationID(file.substr(0, length)), "org.example.Photos");
    } catch (const IdentityError&) {
    }
  }
}

}  // namespace
}  // namespace palisade
