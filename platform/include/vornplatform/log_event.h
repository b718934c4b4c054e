// The appliance's system event log, a platform action.
#ifndef VORNPLATFORM_LOG_EVENT_H
#define VORNPLATFORM_LOG_EVENT_H

// Runs the platform action "VORNLogSet1" with argv: level and kind in decimal, the event id as
// "0x%08x", then the four texts (NULL is passed as ""). 0 (a missing action included); -1 when
// the action could not run or exited non-zero (error register set).
int VORNLogSet1(int level, int kind, unsigned int id, const char* a, const char* b, const char* c,
                const char* d);

#endif
