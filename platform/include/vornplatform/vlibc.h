// Everything of the platform's C-style library in one include.
#ifndef VORNPLATFORM_VLIBC_H
#define VORNPLATFORM_VLIBC_H
#include "vornplatform/action.h"
#include "vornplatform/crypt.h"
#include "vornplatform/err.h"
#include "vornplatform/file.h"
#include "vornplatform/kmod.h"
#include "vornplatform/lock.h"
#include "vornplatform/log.h"
#include "vornplatform/proc.h"
#include "vornplatform/str.h"
#include "vornplatform/szhash.h"
#endif
