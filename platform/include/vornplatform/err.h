// The platform's error register: one {code, file, line} per thread, set by every platform function
// that fails and read by callers that log "[0x%04X %s:%d]".
#ifndef VORNPLATFORM_ERR_H
#define VORNPLATFORM_ERR_H

enum VLIBC_ERR_CODE {
  VLIBC_ERR_NONE = 0x0000,
  VLIBC_ERR_NO_MEMORY = 0x0100,
  VLIBC_ERR_IO = 0x0200,        // open/read/write/rename/fsync failed (errno is kept too)
  VLIBC_ERR_NOT_FOUND = 0x0300, // file, key, section, process or program not there
  VLIBC_ERR_EXEC = 0x0400,      // fork/exec/wait failed or the child was killed by a signal
  VLIBC_ERR_CRYPT = 0x0500,     // cipher failure (bad key file, corrupt or forged text)
  VLIBC_ERR_FORMAT = 0x0600,    // malformed input text
  VLIBC_ERR_TOO_LONG = 0x0700,  // result does not fit the caller's buffer, or input over a limit
  VLIBC_ERR_BUSY = 0x0800,      // a lock is held by someone else
  VLIBC_ERR_BAD_PARAMETER = 0x0D00,
};

// Records code, file and line (the file as a path below src/ where there is one) for this thread,
// with the current errno; errno itself is left as it was. A later success does not clear the
// register: read it right after the failing call.
void VLIBCErrSetEx(int code, const char* file, int line);
int VLIBCErrGet();             // the code of the last failure of this thread, 0 when none
const char* VLIBCErrGetFile(); // the file of the last failure, "" when none (never NULL)
int VLIBCErrGetLine();         // the line of the last failure, 0 when none
int VLIBCErrGetErrno();        // errno seen when the failure was recorded
void VLIBCErrClear();

#include "vornplatform/log.h"
#define VLIBC_ERR_SET(code) VLIBCErrSetEx((code), VORN_SOURCE_FILE, __LINE__)

#endif
