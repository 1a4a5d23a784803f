#include "base/text/sha256.h"

#include "base/text/hexadecimal.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <utility>

namespace quazor {
namespace {

// Those of FIPS 180-4 and its examples.
TEST(Sha256, OfTheTestVectors) {
  EXPECT_EQ(hexadecimal(sha256("")), "e3b0c44298fc1c149afbf4c8996fb92427ae41e4649b934ca495991b7852b855");
  EXPECT_EQ(hexadecimal(sha256("abc")), "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
  EXPECT_EQ(hexadecimal(sha256("abcdbcdecdefdefgefghfghighijhijkijkljklmklmnlmnomnopnopq")),
            "248d6a61d20638b8e5c026930c3e6039a33ce45964ff2167f6ecedd419db06c1");
  EXPECT_EQ(hexadecimal(sha256(std::string(1'000'000, 'a'))),
            "cdc76e5c9914fb9281a1c7e284d73e67f1809a48a497200e046d39ccc7112cd0");
}

// The length of the last block decides whether another follows. Expected by Python's hashlib.
TEST(Sha256, OfZeroBytesAroundTheEndOfABlock) {
  constexpr std::pair<std::size_t, std::string_view> kDigests[] = {
      {55, "02779466cdec163811d078815c633f21901413081449002f24aa3e80f0b88ef7"},
      {56, "d4817aa5497628e7c77e6b606107042bbba3130888c5f47a375e6179be789fbb"},
      {63, "c7723fa1e0127975e49e62e753db53924c1bd84b8ac1ac08df78d09270f3d971"},
      {64, "f5a5fd42d16a20302798ef6ed309979b43003d2320d9f0e8ea9831a92759fb4b"},
      {119, "f616b0d54e78571a9611f343c9f8e022e859e920381ab0e4d3da01e193a7bd7e"},
      {120, "6edd9f6f9cc92cded36e6c4a580933f9c9f1b90562b46903b806f21902a1a54f"}};
  for (const auto& [size, digest] : kDigests) EXPECT_EQ(hexadecimal(sha256(std::string(size, '\0'))), digest) << size;
}

}  // namespace
}  // namespace quazor
