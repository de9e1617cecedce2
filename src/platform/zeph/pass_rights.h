// SPDX-License-Identifier: MIT
// Whether the peers of a unix socket may send descriptors: an option of Linux 6.16 and later, which older
// headers do not name. Older kernels let every peer send them.
#pragma once

#include <sys/socket.h>

#ifndef SO_PASSRIGHTS
#define SO_PASSRIGHTS 83
#endif
