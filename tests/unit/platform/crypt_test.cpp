#include "vornplatform/crypt.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <string>
#include <vector>

#include "support/test_util.h"
#include "vornplatform/err.h"

namespace {

using vorntest::Exists;
using vorntest::FileMode;
using vorntest::ReadFile;
using vorntest::TempDir;

class CryptTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_FALSE(dir_.path().empty());
    keyFile_ = dir_ / "etc/sub/crypt.key";  // its directories do not exist yet
    setenv("VORN_CRYPT_KEY_FILE", keyFile_.c_str(), 1);
    VLIBCErrClear();
  }
  void TearDown() override { unsetenv("VORN_CRYPT_KEY_FILE"); }

  std::string Encrypt(const std::string& plain) {
    char out[1024];
    const int rc = VLIBCCryptSzEncrypt(plain.c_str(), out, sizeof out);
    EXPECT_GT(rc, 0) << plain;
    EXPECT_EQ(static_cast<std::size_t>(rc), std::string(out).size());
    return out;
  }
  std::string Decrypt(const std::string& cipher, int* rc = nullptr) {
    char out[1024];
    const int r = VLIBCCryptSzDecrypt(cipher.c_str(), out, sizeof out);
    if (rc != nullptr) *rc = r;
    return out;
  }

  TempDir dir_;
  std::string keyFile_;
};

TEST_F(CryptTest, RoundTripMakesARootOnlyKeyFile) {
  EXPECT_FALSE(Exists(keyFile_));
  const std::string cipher = Encrypt("s3cret pass\xC3\xA9!");
  EXPECT_TRUE(Exists(keyFile_));
  EXPECT_EQ(FileMode(keyFile_), 0600);
  EXPECT_EQ(ReadFile(keyFile_).size(), 65u);  // 64 hex digits and a line break
  EXPECT_EQ(
      cipher.find_first_not_of("ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/="),
      std::string::npos);
  EXPECT_EQ(cipher.find("s3cret"), std::string::npos);
  int rc = 0;
  EXPECT_EQ(Decrypt(cipher, &rc), "s3cret pass\xC3\xA9!");
  EXPECT_EQ(rc, 14);
  // Same key for the next call; a fresh nonce each time.
  const std::string key = ReadFile(keyFile_);
  const std::string again = Encrypt("s3cret pass\xC3\xA9!");
  EXPECT_NE(again, cipher);
  EXPECT_EQ(Decrypt(again), "s3cret pass\xC3\xA9!");
  EXPECT_EQ(ReadFile(keyFile_), key);
}

// Processes that make the key file at the same moment end up with one key.
TEST_F(CryptTest, ConcurrentFirstUseAgreesOnOneKey) {
  std::vector<pid_t> pids;
  for (int i = 0; i < 6; ++i) {
    pid_t pid = fork();
    ASSERT_GE(pid, 0);
    if (pid == 0) {
      char out[1024];
      if (VLIBCCryptSzEncrypt("shared", out, sizeof out) <= 0) _exit(1);
      _exit(vorntest::WriteFile(dir_ / ("c" + std::to_string(i)), out) ? 0 : 1);
    }
    pids.push_back(pid);
  }
  for (pid_t pid : pids) {
    int status = 0;
    ASSERT_EQ(waitpid(pid, &status, 0), pid);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0);
  }
  for (int i = 0; i < 6; ++i) {
    EXPECT_EQ(Decrypt(ReadFile(dir_ / ("c" + std::to_string(i)))), "shared") << i;
  }
  EXPECT_EQ(vorntest::Run({"/bin/ls", "-A", dir_ / "etc/sub"}).out, "crypt.key\n");
}

TEST_F(CryptTest, EmptyPlainTextRoundTrips) {
  const std::string cipher = Encrypt("");
  int rc = 0;
  EXPECT_EQ(Decrypt(cipher, &rc), "");
  EXPECT_EQ(rc, 1) << "success must be non-zero";
}

TEST_F(CryptTest, LongestPlainTextFitsTheCallersBuffer) {
  const std::string plain(VLIBC_CRYPT_PLAIN_MAX, 'p');
  const std::string cipher = Encrypt(plain);
  EXPECT_LT(cipher.size(), 1024u);
  int rc = 0;
  EXPECT_EQ(Decrypt(cipher, &rc), plain);
  EXPECT_EQ(rc, VLIBC_CRYPT_PLAIN_MAX);
}

TEST_F(CryptTest, TooLongInputOrSmallOutputIsRefused) {
  char out[1024] = "x";
  const std::string tooLong(VLIBC_CRYPT_PLAIN_MAX + 1, 'p');
  EXPECT_EQ(VLIBCCryptSzEncrypt(tooLong.c_str(), out, sizeof out), 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_TOO_LONG);
  EXPECT_STREQ(out, "");
  char small[20];
  EXPECT_EQ(VLIBCCryptSzEncrypt("password", small, sizeof small), 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_TOO_LONG);
  const std::string cipher = Encrypt("a rather long password");
  char tiny[8];
  EXPECT_EQ(VLIBCCryptSzDecrypt(cipher.c_str(), tiny, sizeof tiny), 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_TOO_LONG);
  const std::string huge(100000, 'A');
  EXPECT_EQ(VLIBCCryptSzDecrypt(huge.c_str(), out, sizeof out), 0);
}

TEST_F(CryptTest, TamperedOrGarbageCipherTextIsRefused) {
  const std::string cipher = Encrypt("password");
  for (std::size_t i = 0; i < cipher.size() && cipher[i] != '='; i += 3) {
    std::string t = cipher;
    t[i] = t[i] == 'A' ? 'B' : 'A';
    int rc = 7;
    VLIBCErrClear();
    EXPECT_EQ(Decrypt(t, &rc), "") << i;
    EXPECT_EQ(rc, 0) << i;
    EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_CRYPT) << i;
  }
  for (const char* bad :
       {"", "plain text", "====", "QUJD", "not*base64!", "QUJDRA==QUJD", "QUJDRA=A"}) {
    int rc = 7;
    EXPECT_EQ(Decrypt(bad, &rc), "") << bad;
    EXPECT_EQ(rc, 0) << bad;
  }
  // Cut short.
  int rc = 7;
  Decrypt(cipher.substr(0, cipher.size() - 4), &rc);
  EXPECT_EQ(rc, 0);
}

TEST_F(CryptTest, AnotherKeyCannotRead) {
  const std::string cipher = Encrypt("password");
  setenv("VORN_CRYPT_KEY_FILE", (dir_ / "other.key").c_str(), 1);
  int rc = 7;
  EXPECT_EQ(Decrypt(cipher, &rc), "");
  EXPECT_EQ(rc, 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_CRYPT);
}

TEST_F(CryptTest, BrokenKeyFileIsAnError) {
  ASSERT_TRUE(vorntest::WriteFile(dir_ / "bad.key", "not a key\n", 0600));
  setenv("VORN_CRYPT_KEY_FILE", (dir_ / "bad.key").c_str(), 1);
  char out[1024];
  EXPECT_EQ(VLIBCCryptSzEncrypt("password", out, sizeof out), 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_CRYPT);
  EXPECT_EQ(ReadFile(dir_ / "bad.key"), "not a key\n") << "never replaced";
  setenv("VORN_CRYPT_KEY_FILE", (dir_ / "nodir-file").c_str(), 1);
  ASSERT_TRUE(vorntest::WriteFile(dir_ / "nodir-file", ""));
  setenv("VORN_CRYPT_KEY_FILE", (dir_ / "nodir-file/key").c_str(), 1);
  EXPECT_EQ(VLIBCCryptSzEncrypt("password", out, sizeof out), 0);
}

TEST_F(CryptTest, BadParameters) {
  char out[1024];
  EXPECT_EQ(VLIBCCryptSzEncrypt(nullptr, out, sizeof out), 0);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  EXPECT_EQ(VLIBCCryptSzEncrypt("x", nullptr, 1024), 0);
  EXPECT_EQ(VLIBCCryptSzEncrypt("x", out, 0), 0);
  EXPECT_EQ(VLIBCCryptSzDecrypt(nullptr, out, sizeof out), 0);
  EXPECT_EQ(VLIBCCryptSzDecrypt("x", nullptr, 1024), 0);
  EXPECT_EQ(VLIBCCryptSzDecrypt("x", out, -1), 0);
}

TEST_F(CryptTest, DefaultKeyFileInTheSandbox) {
  ASSERT_TRUE(vorntest::InSandbox()) << "writes " VLIBC_CRYPT_KEY_FILE "; sandbox only";
  unsetenv("VORN_CRYPT_KEY_FILE");
  const std::string cipher = Encrypt("default key");
  EXPECT_EQ(Decrypt(cipher), "default key");
  EXPECT_EQ(FileMode(VLIBC_CRYPT_KEY_FILE), 0600);
}

}  // namespace
