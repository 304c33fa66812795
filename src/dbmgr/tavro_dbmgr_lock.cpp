// The store's lock: one System V semaphore, 1 while it is free.
#include <sys/ipc.h>
#include <sys/sem.h>
#include <time.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "tavro_dbmgr.h"
#include "tavro_log.h"
#include "tavro_memory.h"

int dbmgr_semid = -1;

namespace {

constexpr key_t kLockKey = 95157331;
constexpr unsigned short kAnyProcessMayUseIt = 0777;  // the service may run as another user
constexpr long kNanosecondsPerMillisecond = 1000 * 1000;
constexpr gint64 kPatienceMicroseconds = 500 * 1000;
constexpr int kSetUpPollMilliseconds = 5;
constexpr int kSetUpPolls = 100;

union semun {
  int val;
  semid_ds *buf;
  unsigned short *array;
  seminfo *__buf;
};

int _open_permissions(int semid) {
  semid_ds *record = TAVRO_ZALLOC(semid_ds);
  record->sem_perm.mode = kAnyProcessMayUseIt;
  record->sem_perm.uid = geteuid();
  record->sem_perm.gid = getegid();
  semun argument = {};
  argument.buf = record;
  const int ret = semctl(semid, 0, IPC_SET, argument);
  TAVRO_FREE(record);
  return ret;
}

int _set_free(int semid) {
  semun argument = {};
  argument.val = 1;
  return semctl(semid, 0, SETVAL, argument);
}

int _set_up(int semid) {
  if (_open_permissions(semid) != -1 && _set_free(semid) != -1) return 0;
  TAVRO_LOGD("Setting semaphore permissions failed");
  return -1;
}

// A new set says 0 and was never operated on; the kernel notes the process that sets or changes a value.
bool _was_set_up(int semid) {
  return semctl(semid, 0, GETVAL) > 0 || semctl(semid, 0, GETPID) > 0;
}

// Setting the value while an operation runs would let a second one in beside it, and leave the value one too
// high for good. So a running operation is awaited, but never longer than a person would notice.
void _await_running_operation(int semid) {
  if (!_was_set_up(semid)) return;
  sembuf take = {0, -1, SEM_UNDO};
  const gint64 end = g_get_monotonic_time() + kPatienceMicroseconds;
  int ret;
  do {  // again when a signal handler ran, for what is left of the time
    const timespec patience = {0,
                               static_cast<long>(std::max<gint64>(end - g_get_monotonic_time(), 0)) * 1000};
    ret = semtimedop(semid, &take, 1, &patience);
  } while (ret == -1 && errno == EINTR);
  if (ret == -1 && errno == EAGAIN) TAVRO_LOGD("store lock was held for long, set free");
}

// The set exists: whoever made it is given the time to set it up.
bool _await_set_up(int semid) {
  const timespec pause = {0, kSetUpPollMilliseconds * kNanosecondsPerMillisecond};
  for (int i = 0; i < kSetUpPolls; i++) {
    if (_was_set_up(semid)) return true;
    nanosleep(&pause, nullptr);
  }
  return false;
}

// Retried when a signal handler ran: the lock is neither taken nor refused then.
int _operate(sembuf operation) {
  int ret;
  do {
    ret = semop(dbmgr_semid, &operation, 1);
  } while (ret == -1 && errno == EINTR);
  return ret;
}

// The set was removed, or never opened. The next wait opens it anew: doing so at once would let the signal of
// the operation that runs unlocked now raise the new set's value to 2.
bool is_set_gone = false;

// Kept: the message says "Wait" for both operations.
int _operate_logged(sembuf operation) {
  if (_operate(operation) != -1) return 0;
  is_set_gone = errno == EINVAL || errno == EIDRM;
  TAVRO_LOGD("Semaphore Wait failed with error %s", std::strerror(errno));
  return -1;
}

}  // namespace

int tavro_dbmgr_init_semaphore() {
  const int semid = semget(kLockKey, 1, IPC_CREAT);
  if (semid == -1) {
    TAVRO_LOGD("Semaphore init error %s", std::strerror(errno));
    return -1;
  }
  dbmgr_semid = semid;
  _await_running_operation(semid);
  return _set_up(semid);
}

int tavro_dbmgr_open_semaphore() {
  dbmgr_semid = semget(kLockKey, 1, IPC_CREAT | IPC_EXCL);
  if (dbmgr_semid != -1) return _set_up(dbmgr_semid);
  dbmgr_semid = semget(kLockKey, 1, 0);
  if (dbmgr_semid == -1) {
    TAVRO_LOGD("Semaphore init error %s", std::strerror(errno));
    return -1;
  }
  // Its maker died between the two steps.
  if (!_await_set_up(dbmgr_semid)) return _set_up(dbmgr_semid);
  return 0;
}

int tavro_dbmgr_sem_wait() {
  if (is_set_gone) is_set_gone = tavro_dbmgr_open_semaphore() == -1;
  return _operate_logged({0, -1, SEM_UNDO});
}

int tavro_dbmgr_sem_signal() {
  return _operate_logged({0, 1, SEM_UNDO | IPC_NOWAIT});
}
