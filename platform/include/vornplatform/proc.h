// Processes: exec without a shell, pipes, pid files, liveness and signals, forks.
#ifndef VORNPLATFORM_PROC_H
#define VORNPLATFORM_PROC_H

#include <sys/types.h>

#include <cstdio>

// Runs path with up to four arguments (the first NULL ends them) and waits. The program's exit
// status (0..255); -1 when it could not be started or a signal ended it.
int VLIBCExec(const char* path, const char* a1, const char* a2, const char* a3, const char* a4);
// As VLIBCExec with a NULL-ended list of arguments. flags is the opaque word 187 (0xbb).
int VLIBCExecl(const char* path, int flags, ...);
// argv is a NULL-ended vector whose argv[0] is the program's name, as for execv(2).
int VLIBCExecv(const char* path, char* const argv[], int flags);

// pipe + fork + execv of path with the NULL-ended arguments after mode; mode "r" reads the
// child's stdout, "w" writes its stdin. NULL on failure. Close with VLIBCPclose.
FILE* VLIBCPopen(const char* path, const char* mode, ...);
// Closes the stream and waits: the exit status, or -1.
int VLIBCPclose(FILE* fp);

#define VLIBC_FORK_DETACH 0x40
// fork(); with VLIBC_FORK_DETACH the child is a grandchild adopted by init (no zombie is left).
// 0 in the child, the child's pid in the parent, -1 on failure.
pid_t VLIBCProcForkEx(int flags);
// fork() without waiting; the parent's SIGCHLD handling reaps (see VLIBCProcAlive).
pid_t VLIBCProcForkChildNoWait();

// Writes getpid() and "\n" atomically. 0, -1.
int VLIBCProcPidFileCreate(const char* path);
// The pid in the file; 0 when missing or unreadable, -1 on bad parameter.
pid_t VLIBCReadPidFile(const char* path);
// 1 when pid names a living process (a zombie counts as dead), else 0.
int VLIBCProcAlive(pid_t pid);
// 1 when the pid file names a living process, else 0; never negative.
int VLIBCProcAliveByPidFile(const char* path);
// kill(pid of the file, sig). 0 success, -1 failure.
int VLIBCProcSignalByPidFile(const char* path, int sig, int flags, int reserved);
// Number of processes whose command line (NULs read as blanks) contains pattern.
int VLIBCPs(const char* pattern, int flags, int reserved);
// SIGTERM to every process whose comm equals name. 0 (also when none), -1.
int VLIBCKill(const char* name);

namespace vornnetsdk {
namespace sdk_s {
int VLIBCExec_S(const char* path, const char* a1, const char* a2, const char* a3, const char* a4);
}  // namespace sdk_s
}  // namespace vornnetsdk

#endif
