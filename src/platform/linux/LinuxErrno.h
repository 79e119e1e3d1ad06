#pragma once
// errno values as the seams' results, in one place.

#include <cerrno>

#include "seams/CHidNode.h"

inline EHidStatus HidStatusFromErrno(int error_I) {
  switch (error_I) {
    case EPIPE: return EHidStatus::eStall;
    case EBUSY:
    case EWOULDBLOCK: return EHidStatus::eBusy;
    case ENODEV:
    case ENXIO:
    case ENOENT:
    case ESHUTDOWN: return EHidStatus::eGone;
    case ETIMEDOUT: return EHidStatus::eTimeout;
    case EACCES:
    case EPERM: return EHidStatus::eDenied;
    default: return EHidStatus::eOther;
  }
}
