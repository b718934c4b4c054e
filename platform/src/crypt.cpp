// The reversible cipher of stored passwords: AES-256-GCM, key in a root-only file.
#include "vornplatform/crypt.h"

#include <fcntl.h>
#include <openssl/crypto.h>
#include <openssl/evp.h>
#include <openssl/rand.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "internal.h"
#include "vornplatform/err.h"
#include "vornplatform/log.h"

using vornplatform::internal::HasText;
using vornplatform::internal::NoThrow;

namespace {

constexpr std::size_t kKeyLen = 32;
constexpr std::size_t kNonceLen = 12;
constexpr std::size_t kTagLen = 16;
// Longest cipher text accepted: what the longest plain text gives, with room to spare.
constexpr std::size_t kCipherTextMax = 4096;

struct Key {
  unsigned char bytes[kKeyLen];
  ~Key() { OPENSSL_cleanse(bytes, sizeof bytes); }
};

// Wipes a byte buffer when it goes out of scope.
struct Wiped {
  std::vector<unsigned char> data;
  explicit Wiped(std::size_t n) : data(n) {}
  ~Wiped() {
    if (!data.empty()) OPENSSL_cleanse(data.data(), data.size());
  }
};

struct CtxFree {
  void operator()(EVP_CIPHER_CTX* c) const { EVP_CIPHER_CTX_free(c); }
};
using CtxPtr = std::unique_ptr<EVP_CIPHER_CTX, CtxFree>;

std::string KeyFilePath() {
  const char* env = std::getenv("VORN_CRYPT_KEY_FILE");
  return HasText(env) ? std::string(env) : std::string(VLIBC_CRYPT_KEY_FILE);
}

int HexValue(char c) {
  if (c >= '0' && c <= '9') return c - '0';
  if (c >= 'a' && c <= 'f') return c - 'a' + 10;
  if (c >= 'A' && c <= 'F') return c - 'A' + 10;
  return -1;
}

// The key file holds 64 hex digits and a line break (32 raw bytes are accepted as well).
bool ParseKey(const std::string& text, Key* key) {
  if (text.size() == kKeyLen) {
    std::memcpy(key->bytes, text.data(), kKeyLen);
    return true;
  }
  std::string t = text;
  while (!t.empty() && (t.back() == '\n' || t.back() == '\r' || t.back() == ' ')) t.pop_back();
  if (t.size() != 2 * kKeyLen) return false;
  for (std::size_t i = 0; i < kKeyLen; ++i) {
    const int hi = HexValue(t[2 * i]);
    const int lo = HexValue(t[2 * i + 1]);
    if (hi < 0 || lo < 0) return false;
    key->bytes[i] = static_cast<unsigned char>(hi * 16 + lo);
  }
  OPENSSL_cleanse(&t[0], t.size());
  return true;
}

bool ReadKeyFile(const std::string& path, Key* key) {
  int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NOCTTY);
  if (fd < 0) return false;
  struct stat st;
  if (fstat(fd, &st) != 0 || !S_ISREG(st.st_mode)) {
    close(fd);
    errno = EINVAL;
    return false;
  }
  if ((st.st_mode & 077) != 0 && st.st_uid == geteuid()) fchmod(fd, 0600);
  char buf[256];
  std::size_t got = 0;
  for (;;) {
    ssize_t n = read(fd, buf + got, sizeof buf - got);
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0) break;
    got += static_cast<std::size_t>(n);
    if (got == sizeof buf) break;
  }
  close(fd);
  std::string text(buf, got);
  OPENSSL_cleanse(buf, sizeof buf);
  const bool ok = ParseKey(text, key);
  if (!text.empty()) OPENSSL_cleanse(&text[0], text.size());
  if (!ok) errno = EINVAL;
  return ok;
}

// Makes the key file with a fresh random key. Two processes racing here end with the same key:
// the file is linked into place only when no other has appeared.
bool CreateKeyFile(const std::string& path) {
  const std::size_t slash = path.rfind('/');
  const std::string dir =
      slash == std::string::npos ? "." : (slash == 0 ? "/" : path.substr(0, slash));
  if (vornplatform::internal::MakeDirs(dir, 0755) != 0) return false;
  Key key;
  if (RAND_bytes(key.bytes, static_cast<int>(kKeyLen)) != 1) {
    errno = EIO;
    return false;
  }
  static const char kHex[] = "0123456789abcdef";
  char text[2 * kKeyLen + 1];
  for (std::size_t i = 0; i < kKeyLen; ++i) {
    text[2 * i] = kHex[key.bytes[i] >> 4];
    text[2 * i + 1] = kHex[key.bytes[i] & 0x0f];
  }
  text[2 * kKeyLen] = '\n';
  std::string tmpl = (dir == "/" ? std::string() : dir) + "/.vorn_crypt.key.XXXXXX";
  std::vector<char> tmp(tmpl.begin(), tmpl.end());
  tmp.push_back('\0');
  int fd = mkostemp(tmp.data(), O_CLOEXEC);  // mode 0600
  if (fd < 0) {
    OPENSSL_cleanse(text, sizeof text);
    return false;
  }
  bool ok = fchmod(fd, 0600) == 0;
  std::size_t off = 0;
  while (ok && off < sizeof text) {
    ssize_t n = write(fd, text + off, sizeof text - off);
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0)
      ok = false;
    else
      off += static_cast<std::size_t>(n);
  }
  OPENSSL_cleanse(text, sizeof text);
  ok = ok && fsync(fd) == 0;
  ok = (close(fd) == 0) && ok;
  if (ok && link(tmp.data(), path.c_str()) != 0 && errno != EEXIST) ok = false;
  const int e = errno;
  unlink(tmp.data());
  errno = e;
  return ok;
}

bool LoadKey(Key* key) {
  const std::string path = KeyFilePath();
  if (ReadKeyFile(path, key)) return true;
  if (errno == ENOENT && CreateKeyFile(path) && ReadKeyFile(path, key)) return true;
  VORN_LOG(LOG_ERR, "Cannot use cipher key file [%s]: %s", path.c_str(), std::strerror(errno));
  VLIBC_ERR_SET(VLIBC_ERR_CRYPT);
  return false;
}

const char kB64[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

std::string Base64Encode(const unsigned char* p, std::size_t n) {
  std::string out;
  out.reserve((n + 2) / 3 * 4);
  for (std::size_t i = 0; i < n; i += 3) {
    const unsigned v =
        (p[i] << 16) | ((i + 1 < n ? p[i + 1] : 0) << 8) | (i + 2 < n ? p[i + 2] : 0);
    out += kB64[(v >> 18) & 63];
    out += kB64[(v >> 12) & 63];
    out += i + 1 < n ? kB64[(v >> 6) & 63] : '=';
    out += i + 2 < n ? kB64[v & 63] : '=';
  }
  return out;
}

int B64Value(char c) {
  if (c >= 'A' && c <= 'Z') return c - 'A';
  if (c >= 'a' && c <= 'z') return c - 'a' + 26;
  if (c >= '0' && c <= '9') return c - '0' + 52;
  if (c == '+') return 62;
  if (c == '/') return 63;
  return -1;
}

// Strict base64: whole groups of four, padding only at the end.
bool Base64Decode(const char* text, std::size_t n, std::vector<unsigned char>* out) {
  if (n == 0 || n % 4 != 0) return false;
  out->clear();
  out->reserve(n / 4 * 3);
  for (std::size_t i = 0; i < n; i += 4) {
    const bool last = i + 4 == n;
    int v[4];
    int pad = 0;
    for (int j = 0; j < 4; ++j) {
      const char c = text[i + static_cast<std::size_t>(j)];
      if (c == '=' && last && j >= 2) {
        v[j] = 0;
        ++pad;
        continue;
      }
      if (pad > 0) return false;  // data after padding
      v[j] = B64Value(c);
      if (v[j] < 0) return false;
    }
    const unsigned w = (static_cast<unsigned>(v[0]) << 18) | (static_cast<unsigned>(v[1]) << 12) |
                       (static_cast<unsigned>(v[2]) << 6) | static_cast<unsigned>(v[3]);
    out->push_back(static_cast<unsigned char>(w >> 16));
    if (pad < 2) out->push_back(static_cast<unsigned char>(w >> 8));
    if (pad < 1) out->push_back(static_cast<unsigned char>(w));
  }
  return true;
}

}  // namespace

int VLIBCCryptSzEncrypt(const char* plain, char* out, int size) {
  if (plain == nullptr || out == nullptr || size <= 0) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return 0;
  }
  out[0] = '\0';
  const std::size_t plainLen = std::strlen(plain);
  if (plainLen > VLIBC_CRYPT_PLAIN_MAX) {
    VLIBC_ERR_SET(VLIBC_ERR_TOO_LONG);
    return 0;
  }
  const std::size_t blobLen = kNonceLen + plainLen + kTagLen;
  if ((blobLen + 2) / 3 * 4 + 1 > static_cast<std::size_t>(size)) {
    VLIBC_ERR_SET(VLIBC_ERR_TOO_LONG);
    return 0;
  }
  return NoThrow(0, [&]() -> int {
    Key key;
    if (!LoadKey(&key)) return 0;
    std::vector<unsigned char> blob(blobLen);
    unsigned char* nonce = blob.data();
    unsigned char* cipher = nonce + kNonceLen;
    unsigned char* tag = cipher + plainLen;
    CtxPtr ctx(EVP_CIPHER_CTX_new());
    int len = 0;
    int finalLen = 0;
    const bool ok =
        ctx && RAND_bytes(nonce, static_cast<int>(kNonceLen)) == 1 &&
        EVP_EncryptInit_ex(ctx.get(), EVP_aes_256_gcm(), nullptr, nullptr, nullptr) == 1 &&
        EVP_CIPHER_CTX_ctrl(ctx.get(), EVP_CTRL_GCM_SET_IVLEN, static_cast<int>(kNonceLen),
                            nullptr) == 1 &&
        EVP_EncryptInit_ex(ctx.get(), nullptr, nullptr, key.bytes, nonce) == 1 &&
        EVP_EncryptUpdate(ctx.get(), cipher, &len, reinterpret_cast<const unsigned char*>(plain),
                          static_cast<int>(plainLen)) == 1 &&
        EVP_EncryptFinal_ex(ctx.get(), cipher + len, &finalLen) == 1 &&
        static_cast<std::size_t>(len + finalLen) == plainLen &&
        EVP_CIPHER_CTX_ctrl(ctx.get(), EVP_CTRL_GCM_GET_TAG, static_cast<int>(kTagLen), tag) == 1;
    if (!ok) {
      VLIBC_ERR_SET(VLIBC_ERR_CRYPT);
      return 0;
    }
    const std::string text = Base64Encode(blob.data(), blob.size());
    std::memcpy(out, text.c_str(), text.size() + 1);
    return static_cast<int>(text.size());
  });
}

int VLIBCCryptSzDecrypt(const char* cipherText, char* out, int size) {
  if (cipherText == nullptr || out == nullptr || size <= 0) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return 0;
  }
  out[0] = '\0';
  const std::size_t textLen = strnlen(cipherText, kCipherTextMax + 1);
  if (textLen > kCipherTextMax) {
    VLIBC_ERR_SET(VLIBC_ERR_TOO_LONG);
    return 0;
  }
  return NoThrow(0, [&]() -> int {
    std::vector<unsigned char> blob;
    if (!Base64Decode(cipherText, textLen, &blob) || blob.size() < kNonceLen + kTagLen) {
      VLIBC_ERR_SET(VLIBC_ERR_CRYPT);
      return 0;
    }
    const std::size_t plainLen = blob.size() - kNonceLen - kTagLen;
    if (plainLen + 1 > static_cast<std::size_t>(size)) {
      VLIBC_ERR_SET(VLIBC_ERR_TOO_LONG);
      return 0;
    }
    Key key;
    if (!LoadKey(&key)) return 0;
    const unsigned char* nonce = blob.data();
    const unsigned char* cipher = nonce + kNonceLen;
    unsigned char* tag = blob.data() + kNonceLen + plainLen;
    Wiped plain(plainLen + 16);
    CtxPtr ctx(EVP_CIPHER_CTX_new());
    int len = 0;
    int finalLen = 0;
    const bool ok =
        ctx && EVP_DecryptInit_ex(ctx.get(), EVP_aes_256_gcm(), nullptr, nullptr, nullptr) == 1 &&
        EVP_CIPHER_CTX_ctrl(ctx.get(), EVP_CTRL_GCM_SET_IVLEN, static_cast<int>(kNonceLen),
                            nullptr) == 1 &&
        EVP_DecryptInit_ex(ctx.get(), nullptr, nullptr, key.bytes, nonce) == 1 &&
        EVP_DecryptUpdate(ctx.get(), plain.data.data(), &len, cipher, static_cast<int>(plainLen)) ==
            1 &&
        EVP_CIPHER_CTX_ctrl(ctx.get(), EVP_CTRL_GCM_SET_TAG, static_cast<int>(kTagLen), tag) == 1 &&
        EVP_DecryptFinal_ex(ctx.get(), plain.data.data() + len, &finalLen) == 1 &&
        static_cast<std::size_t>(len + finalLen) == plainLen;
    if (!ok) {
      VLIBC_ERR_SET(VLIBC_ERR_CRYPT);  // forged, damaged or made with another key
      return 0;
    }
    if (std::memchr(plain.data.data(), '\0', plainLen) != nullptr) {
      VLIBC_ERR_SET(VLIBC_ERR_FORMAT);
      return 0;
    }
    std::memcpy(out, plain.data.data(), plainLen);
    out[plainLen] = '\0';
    // An empty plain text still reports success.
    return plainLen > 0 ? static_cast<int>(plainLen) : 1;
  });
}
