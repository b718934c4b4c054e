#include "vornwireless/semaphore/semaphore.h"

#include <sys/ipc.h>
#include <sys/sem.h>

#include <cerrno>
#include <ctime>

#include "vornplatform/log.h"

namespace vornwireless {
namespace semaphore {

int Semaphore::Get(int* id) {
  int semid = semget(static_cast<key_t>(_key), 1, IPC_CREAT | IPC_EXCL | 0666);
  if (semid >= 0) {
    if (semctl(semid, 0, SETVAL, 1) < 0) return -1;
    *id = semid;
    return 0;
  }
  if (errno != EEXIST) return -1;
  semid = semget(static_cast<key_t>(_key), 1, 0666);
  *id = semid;
  return semid < 0 ? -1 : 0;
}

int Semaphore::Enter() {
  int id = -1;
  if (Get(&id) < 0) return -1;
  struct sembuf op = {0, -1, SEM_UNDO};
  struct timespec limit;
  limit.tv_sec = static_cast<time_t>(_waitLimitMs / 1000);
  limit.tv_nsec = (_waitLimitMs % 1000) * 1000000L;
  if (semtimedop(id, &op, 1, &limit) < 0) {
    VORN_LOG(LOG_ERR, "semop fail semid %d errno %d", id, errno);
    return -1;
  }
  return 0;
}

int Semaphore::Release() {
  int id = -1;
  if (Get(&id) < 0) return -1;
  struct sembuf op = {0, 1, SEM_UNDO};
  if (semop(id, &op, 1) < 0) {
    VORN_LOG(LOG_ERR, "semop fail semid %d errno %d", id, errno);
    return -1;
  }
  if (semctl(id, 0, IPC_RMID, 0) < 0) {
    VORN_LOG(LOG_ERR, "semctl fail to remove semaphore semid %d errno %d", id, errno);
    return -1;
  }
  return 0;
}

}  // namespace semaphore
}  // namespace vornwireless
