// Advisory whole-file locks (flock) on lock files.
#ifndef VORNPLATFORM_LOCK_H
#define VORNPLATFORM_LOCK_H

// Opens (creating, mode 0644, close-on-exec) the lock file and takes a non-blocking flock,
// exclusive or shared. 1 with *fd set when got; 0 when another holder has it (*fd = -1,
// VLIBC_ERR_BUSY); -1 on error (bad parameter, file cannot be opened). Two calls of one process
// on the same file are two holders.
int VLIBCFileLockByFile(const char* path, int exclusive, int* fd);
// Releases and closes a descriptor from VLIBCFileLockByFile. 1 success, 0 failure (bad or
// closed descriptor). The lock file itself stays.
int VLIBCFileUnlockByFile(int fd);
// Closes every lock descriptor of this process (a forked child before exec; in a child this
// leaves the parent's locks held). Safe between fork and exec. 0.
int VLIBCFileCloseLock();

#endif
