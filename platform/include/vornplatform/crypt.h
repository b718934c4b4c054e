// The reversible cipher of stored passwords: AES-256-GCM with a root-only key file made on first
// use; the text form is base64 (standard alphabet, padded, one line) of nonce(12)|ciphertext|
// tag(16). The key file holds 64 hex digits and a line break, mode 0600; its directory is made
// (0755) when missing. The environment variable VORN_CRYPT_KEY_FILE, when set and not empty,
// names another key file (for tests and tools).
#ifndef VORNPLATFORM_CRYPT_H
#define VORNPLATFORM_CRYPT_H

#define VLIBC_CRYPT_KEY_FILE "/usr/vorn/etc/.vorn_crypt.key"
#define VLIBC_CRYPT_PLAIN_MAX 700

// Non-zero success, 0 failure (error register set). out holds at most size bytes with the NUL
// and is "" after a failure.
// Encrypt: the cipher text's length. Plain text longer than VLIBC_CRYPT_PLAIN_MAX, or a result
// that does not fit, is refused (VLIBC_ERR_TOO_LONG).
int VLIBCCryptSzEncrypt(const char* plain, char* out, int size);
// Decrypt: the plain text's length, or 1 for an empty plain text. Damaged, forged or foreign
// cipher text is refused (VLIBC_ERR_CRYPT).
int VLIBCCryptSzDecrypt(const char* cipher, char* out, int size);

#endif
