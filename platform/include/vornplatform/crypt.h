// The reversible cipher of stored passwords: AES-256-GCM with a root-only key file made on first
// use; the text form is base64 of nonce|ciphertext|tag.
#ifndef VORNPLATFORM_CRYPT_H
#define VORNPLATFORM_CRYPT_H

#define VLIBC_CRYPT_KEY_FILE "/usr/vorn/etc/.vorn_crypt.key"
#define VLIBC_CRYPT_PLAIN_MAX 700

// Non-zero success (the text length), 0 failure. out holds at most size bytes with the NUL.
int VLIBCCryptSzEncrypt(const char* plain, char* out, int size);
int VLIBCCryptSzDecrypt(const char* cipher, char* out, int size);

#endif
