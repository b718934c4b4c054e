// The per-thread error register.
#include "vornplatform/err.h"

#include <cerrno>
#include <cstring>

namespace {

struct ErrRegister {
  int code = 0;
  int line = 0;
  int savedErrno = 0;
  char file[128] = {0};
};

thread_local ErrRegister tErr;

}  // namespace

void VLIBCErrSetEx(int code, const char* file, int line) {
  const int savedErrno = errno;
  tErr.code = code;
  tErr.line = line;
  tErr.savedErrno = savedErrno;
  if (file != nullptr) {
    std::strncpy(tErr.file, file, sizeof tErr.file - 1);
    tErr.file[sizeof tErr.file - 1] = '\0';
  } else {
    tErr.file[0] = '\0';
  }
  errno = savedErrno;
}

int VLIBCErrGet() { return tErr.code; }

const char* VLIBCErrGetFile() { return tErr.file; }

int VLIBCErrGetLine() { return tErr.line; }

int VLIBCErrGetErrno() { return tErr.savedErrno; }

void VLIBCErrClear() {
  tErr.code = 0;
  tErr.line = 0;
  tErr.savedErrno = 0;
  tErr.file[0] = '\0';
}
