// SPDX-License-Identifier: MIT
#include "util/error_table.h"

namespace brivo {

namespace {

// One row a line. Misspelt names and texts, names that stand in two rows and a blank at the end of a text are
// what clients know; they stay.
// clang-format off
constexpr ErrorDescription kErrors[] = {
    {0, "success", "", "_operation success."},
    {-9900, "OVLegacyReturnCodeCommunicationErr", "", "_device communication error."},
    {-9901, "OVLegacyReturnCodeDeviceNotFoundErr", "", "_device not found."},
    {-9902, "OVLegacyReturnCodeDeviceNotOpenErr", "", "_device not open."},
    {-9903, "OVLegacyReturnCodeFileCorruptedErr", "", "_file corrupted."},
    {-9904, "OVLegacyReturnCodeIOPendingErr", "", "_device IO Pending."},
    {-9905, "OVLegacyReturnCodeInvalidObjectErr", "", "_object invalid."},
    {-9906, "OVLegacyReturnCodeInvalidPropertyErr", "", "_object property invalid."},
    {-9907, "OVLegacyReturnCodeIndexOutOfRangeErr", "", "_object index out of range."},
    {-9908, "OVLegacyReturnCodePropertyTypeNotFoundErr", "", "_object property type invalid."},
    {-9909, "OVLegacyReturnCodeCannotYieldDevice", "", "_device won't yield."},
    {-9910, "OVLegacyReturnCodeDataTypeNotFoundErr", "", "_object data type not found."},
    {-9911, "OVLegacyReturnCodeDeviceMemoryAllocationErr", "", "_device can't allocate memory."},
    {-9912, "OVLegacyReturnCodeDeviceInternalErr", "", "_device internal error."},
    {-9913, "OVLegacyReturnCodeDeviceInvalidParamErr", "", "_device parameter invalid."},
    {-9914, "OVLegacyReturnCodeDeviceAlreadyOpenErr", "", "_device already open."},
    {-9915, "OVLegacyReturnCodeDeviceLocationIDNotFoundErr", "", "_device usb location ID invalid. "},
    {-9916, "OVLegacyReturnCodeDeviceLocationIDNotFoundErr", "", "_device fw GUID invalid."},
    {-9917, "OVLegacyReturnCodeDeviceIOServicePathNotFoundErr", "", "_device ioservice path invalid."},
    {-9918, "OVLegacyReturnCodeDeviceUnsupportedErr", "", "_device unsupported."},
    {-9919, "OVLegacyReturnCodeFrameworkInternalErr", "", "_framework internal error."},
    {-9920, "OVLegacyReturnCodeExtensionInternalErr", "", "_obsoleted"},
    {-9921, "OVLegacyReturnCodeInvalidSessionErr", "", "_device session invalid."},
    {-9922, "kOVASandboxViolation", "OVReturnInvalidParam", "_module parameter invalid"},
    {-9923, "kOVASecureSessionRequired", "OVReturnCommunicationTimedOut", "_module communication timed out."},
    {-9924, "", "OVReturnScanOperationCanceled", "_scaner action canceled."},
    {-9925, "", "OVReturnScannerInUseByLocalUser", "_scanner in use locally."},
    {-9926, "", "OVReturnScannerInUseByRemoteUser", "_scanner in use remotely."},
    {-9927, "", "OVReturnDeviceFailedToOpenSession", "_device open session failed."},
    {-9928, "", "OVReturnDeviceFailedToCloseSession", "_device close session failed."},
    {-9929, "", "OVReturnScannerFailedToSelectFunctionalUnit", "_scanner functional unit selection failed."},
    {-9930, "", "OVReturnScannerFailedToCompleteOverviewScan", "_scanner overview scan failed."},
    {-9931, "", "OVReturnScannerFailedToCompleteScan", "_scanner requested scan failed."},
    {-9932, "", "OVReturnReceivedUnsolicitedScannerStatusInfo", "_scanner reported unsolicited status."},
    {-9933, "", "OVReturnReceivedUnsolicitedScannerStatusInfo", "_scanner reported unsolicited error."},
    {-9934, "", "OVReturnDownloadFailed", "_device download failed."},
    {-9935, "", "OVReturnUploadFailed", "_device upload failed."},
    {-9936, "", "OVReturnFailedToCompletePassThroughCommand", "_camera passthru command failed."},
    {-9937, "", "OVReturnDownloadCanceled", "_device download canceled."},
    {-9938, "OVReturnFailedToEnabeTethering", "OVReturnFailedToEnableTethering", "_camera enable tethering failed."},
    {-9939, "OVReturnFailedToDisabeTethering", "OVReturnFailedToDisableTethering", "_camera disable tethering failed."},
    {-9940, "", "OVReturnFailedToCompleteSendMessageRequest", "_device send message failed."},
    {-9941, "", "OVReturnDeleteFilesFailed", "_camera delete files failed."},
    {-9942, "", "OVReturnDeleteFilesCanceled", "_camera delete files canceled."},
    {-9943, "", "OVReturnDeviceIsPasscodeLocked", "_noreldevice is locked or unpaired."},
    {-9944, "", "OVReturnDeviceFailedToTakePicture", "_camera failed to take picture."},
    {-9945, "", "OVReturnDeviceSoftwareNotInstalled", "_obsolete | _device software not installed."},
    {-9946, "", "OVReturnDeviceSoftwareIsBeingInstalled", "_obsolete | _device software installing."},
    {-9947, "", "OVReturnDeviceSoftwareInstallationCompleted", "_obsolete | _device software installed."},
    {-9948, "", "OVReturnDeviceSoftwareInstallationCanceled", "_obsolete | _device software install failed."},
    {-9949, "", "OVReturnDeviceSoftwareInstallationFailed", "_obsolete | _device software install canceled."},
    {-9950, "", "OVReturnDeviceSoftwareNotAvailable", "_obsolete | _device software not available."},
    {-9951, "", "OVReturnDeviceCouldNotPair", "_noreldevice pairing failed."},
    {-9952, "", "OVReturnDeviceCouldNotPair", "_noreldevice unpairing failed."},
    {-9953, "", "OVReturnDeviceNeedsCredentials", "_uscandevice needs credentials."},
    {-9954, "", "OVReturnDeviceIsBusyEnumerating", "_camera is enumerating content."},
    {-9955, "", "OVReturnDeviceCommandGeneralFailure", "_device command failed."},
    {-9956, "", "OVReturnDeviceFailedToCompleteTransfer", "_camera received incorrect data size."},
    {-9957, "", "OVReturnDeviceFailedToSendData", "_camera send data failed."},
    {-9958, "", "OVReturnSessionNotOpened", "_device session not open."},
    {-21345, "", "OVReturnConnectionFailedToOpen", "_device module ZEPH communication failed."},
    {-128, "userCanceledErr", "", "[VaspErrors.h] _user operation canceled."},
    {-50, "paramErr", "", "[VaspErrors.h] _device parameter invalid."},
    {-47, "fBsyErr", "", "[VaspErrors.h] _scanner has too many clients."},
    {-43, "fnfErr", "", "[VaspErrors.h] _file not found."},
    {-4, "unimpErr", "", "[VaspErrors.h] _device call unimplemented."},
    {1, "EPERM", "", "[errno.h] _file operation not permitted."},
    {17, "EEXIST", "", "[errno.h] _file already exists."},
    {28, "ENOSPC", "", "[errno.h] _device out of space."},
    {725, "kChannelReturnBusy", "", "[ChannelReturn.h] _device channel busy."},
    {726, "kChannelReturnTimeout", "", "[ChannelReturn.h] _device timed out."},
    {8, "KERN_NO_ACCESS", "", "[kern_return.h] _kernel reurned no access."},
};
// clang-format on

}  // namespace

std::span<const ErrorDescription> errorTable() { return kErrors; }

}  // namespace brivo
