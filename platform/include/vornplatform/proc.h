// Processes: exec without a shell, pipes, pid files, liveness and signals, forks.
//
// Children started here get default signal dispositions and an empty signal mask. The exit status
// of a child can only be collected while SIGCHLD is not set to SIG_IGN and no other code reaps it
// (waitpid(-1, ...)); otherwise the call reports -1. The fork functions below and the child
// starts here are serialized, so that a child forked by one thread never holds the pipes of a
// program another thread is starting. Every program runs as the leader of a process group of its
// own under a time limit (child_limit.h): one that outlives it is killed with its group, logged,
// and the call reports -1 (VLIBCPclose) or -1/NULL as for a program that could not run.
#ifndef VORNPLATFORM_PROC_H
#define VORNPLATFORM_PROC_H

#include <sys/types.h>

#include <cstdio>

// Runs path (argv[0] = path) with up to four arguments (the first NULL ends them) and waits.
// The program's exit status (0..255); -1 when it could not be started or a signal ended it.
int VLIBCExec(const char* path, const char* a1, const char* a2, const char* a3, const char* a4);
// As VLIBCExec with a NULL-ended list of arguments. flags is the opaque word 187 (0xbb).
int VLIBCExecl(const char* path, int flags, ...);
// argv is a NULL-ended vector whose argv[0] is the program's name, as for execv(2); a NULL or
// empty argv runs path with argv[0] = path.
int VLIBCExecv(const char* path, char* const argv[], int flags);

// pipe + fork + execv of path with the NULL-ended arguments after mode (argv[0] is path); mode "r"
// reads the child's stdout, "w" writes its stdin. NULL on failure, a program that cannot be
// executed included. Close with VLIBCPclose.
FILE* VLIBCPopen(const char* path, const char* mode, ...);
// Closes the stream and waits: the exit status, or -1 (also for a stream not from VLIBCPopen,
// which is then left open). Thread-safe.
int VLIBCPclose(FILE* fp);

#define VLIBC_FORK_DETACH 0x40
// fork(); with VLIBC_FORK_DETACH the child is a grandchild in a new session, adopted by init (no
// zombie is left; the parent must not wait for it). 0 in the child, the child's pid in the
// parent, -1 on failure.
pid_t VLIBCProcForkEx(int flags);
// fork() without waiting; the parent's SIGCHLD handling reaps (see VLIBCProcAlive).
pid_t VLIBCProcForkChildNoWait();

// Writes getpid() and "\n" atomically. 0, -1.
int VLIBCProcPidFileCreate(const char* path);
// The pid the file holds (one decimal number, blanks and line breaks around it allowed); 0 when
// missing, unreadable or anything else, -1 on bad parameter.
pid_t VLIBCReadPidFile(const char* path);
// 1 when pid names a living process (a zombie counts as dead), else 0.
int VLIBCProcAlive(pid_t pid);
// 1 when the pid file names a living process, else 0; never negative.
int VLIBCProcAliveByPidFile(const char* path);
// kill(pid of the file, sig). 0 success, -1 failure.
int VLIBCProcSignalByPidFile(const char* path, int sig, int flags, int reserved);
// Number of processes other than the caller whose command line (NULs read as blanks) contains
// pattern; -1 on bad parameter or without /proc.
int VLIBCPs(const char* pattern, int flags, int reserved);
// SIGTERM to every process other than the caller whose comm equals name (its first 15
// characters, as the kernel keeps them). 0 (also when none), -1.
int VLIBCKill(const char* name);

namespace vornnetsdk {
namespace sdk_s {
int VLIBCExec_S(const char* path, const char* a1, const char* a2, const char* a3, const char* a4);
}  // namespace sdk_s
}  // namespace vornnetsdk

#endif
