// SPDX-License-Identifier: MIT
#include "ptp/code_tables.h"

namespace brivo {

namespace {

// ISO 15740, with the three events that a vendor added, and the failure reasons of CIPA DC-005.
// clang-format off
constexpr PTPCodeName kResponses[] = {
    {0x2000, "PTPResponseCodeUndefined"},
    {0x2001, "PTPResponseCodeOK"},
    {0x2002, "PTPResponseCodeGeneralError"},
    {0x2003, "PTPResponseCodeSessionNotOpen"},
    {0x2004, "PTPResponseCodeInvalidTransactionID"},
    {0x2005, "PTPResponseCodeOperationNotSupported"},
    {0x2006, "PTPResponseCodeParameterNotSupported"},
    {0x2007, "PTPResponseCodeIncompleteTransfer"},
    {0x2008, "PTPResponseCodeInvalidStorageID"},
    {0x2009, "PTPResponseCodeInvalidObjectHandle"},
    {0x200A, "PTPResponseCodeDevicePropNotSupported"},
    {0x200B, "PTPResponseCodeInvalidObjectFormatCode"},
    {0x200C, "PTPResponseCodeStoreFull"},
    {0x200D, "PTPResponseCodeObjectWriteProtected"},
    {0x200E, "PTPResponseCodeStoreReadOnly"},
    {0x200F, "PTPResponseCodeAccessDenied"},
    {0x2010, "PTPResponseCodeNoThumbnailPresent"},
    {0x2011, "PTPResponseCodeSelfTestFailed"},
    {0x2012, "PTPResponseCodePartialDeletion"},
    {0x2013, "PTPResponseCodeStoreNotAvailable"},
    {0x2014, "PTPResponseCodeSpecificationByFormatUnsupported"},
    {0x2015, "PTPResponseCodeNoValidObjectInfo"},
    {0x2016, "PTPResponseCodeInvalidCodeFormat"},
    {0x2017, "PTPResponseCodeUnknownVendorCode"},
    {0x2018, "PTPResponseCodeCaptureAlreadyTerminated"},
    {0x2019, "PTPResponseCodeDeviceBusy"},
    {0x201A, "PTPResponseCodeInvalidParentObject"},
    {0x201B, "PTPResponseCodeInvalidDevicePropFormat"},
    {0x201C, "PTPResponseCodeInvalidDevicePropValue"},
    {0x201D, "PTPResponseCodeInvalidParameter"},
    {0x201E, "PTPResponseCodeSessionAlreadyOpen"},
    {0x201F, "PTPResponseCodeTransactionCancelled"},
    {0x2020, "PTPResponseCodeSpecificationOfDestinationUnsupported"},
};

constexpr PTPCodeName kEvents[] = {
    {0x4000, "PTPEventCodeUndefined"},
    {0x4001, "PTPEventCodeCancelTransaction"},
    {0x4002, "PTPEventCodeObjectAdded"},
    {0x4003, "PTPEventCodeObjectRemoved"},
    {0x4004, "PTPEventCodeStoreAdded"},
    {0x4005, "PTPEventCodeStoreRemoved"},
    {0x4006, "PTPEventCodeDevicePropChanged"},
    {0x4007, "PTPEventCodeObjectInfoChanged"},
    {0x4008, "PTPEventCodeDeviceInfoChanged"},
    {0x4009, "PTPEventCodeRequestObjectTransfer"},
    {0x400A, "PTPEventCodeStoreFull"},
    {0x400B, "PTPEventCodeDeviceReset"},
    {0x400C, "PTPEventCodeStorageInfoChanged"},
    {0x400D, "PTPEventCodeCaptureComplete"},
    {0x400E, "PTPEventCodeUnreportedStatus"},
    {0xC001, "PTPEventCodeNorelDeviceUnlocked"},
    {0xC002, "PTPEventCodeNorelUserAssignedNameChanged"},
    {0xC003, "PTPEventCodeNorelRestartSession"},
};

constexpr PTPCodeName kDeviceProperties[] = {
    {0x5000, "PTPDevicePropCodeUndefined"},
    {0x5001, "PTPDevicePropCodeBatteryLevel"},
    {0x5002, "PTPDevicePropCodeFunctionalMode"},
    {0x5003, "PTPDevicePropCodeImageSize"},
    {0x5004, "PTPDevicePropCodeCompressionSetting"},
    {0x5005, "PTPDevicePropCodeWhiteBalance"},
    {0x5006, "PTPDevicePropCodeRGBGain"},
    {0x5007, "PTPDevicePropCodeFNumber"},
    {0x5008, "PTPDevicePropCodeFocalLength"},
    {0x5009, "PTPDevicePropCodeFocusDistance"},
    {0x500A, "PTPDevicePropCodeFocusMode"},
    {0x500B, "PTPDevicePropCodeExposureMeteringMode"},
    {0x500C, "PTPDevicePropCodeFlashMode"},
    {0x500D, "PTPDevicePropCodeExposureTime"},
    {0x500E, "PTPDevicePropCodeExposureProgramMode"},
    {0x500F, "PTPDevicePropCodeExposureIndex"},
    {0x5010, "PTPDevicePropCodeExposureBiasCompensation"},
    {0x5011, "PTPDevicePropCodeDateTime"},
    {0x5012, "PTPDevicePropCodeCaptureDelay"},
    {0x5013, "PTPDevicePropCodeStillCaptureMode"},
    {0x5014, "PTPDevicePropCodeContrast"},
    {0x5015, "PTPDevicePropCodeSharpness"},
    {0x5016, "PTPDevicePropCodeDigitalZoom"},
    {0x5017, "PTPDevicePropCodeEffectMode"},
    {0x5018, "PTPDevicePropCodeBurstNumber"},
    {0x5019, "PTPDevicePropCodeBurstInterval"},
    {0x501A, "PTPDevicePropCodeTimelapseNumber"},
    {0x501B, "PTPDevicePropCodeTimelapseInterval"},
    {0x501C, "PTPDevicePropCodeFocusMeteringMode"},
    {0x501D, "PTPDevicePropCodeUploadURL"},
    {0x501E, "PTPDevicePropCodeArtist"},
    {0x501F, "PTPDevicePropCodeCopyrightInfo"},
};

constexpr PTPCodeName kObjectFormats[] = {
    {0x3000, "PTPObjectFormatCodeUndefined"},
    {0x3001, "PTPObjectFormatCodeAssociation"},
    {0x3002, "PTPObjectFormatCodeScript"},
    {0x3003, "PTPObjectFormatCodeExecutable"},
    {0x3004, "PTPObjectFormatCodeText"},
    {0x3005, "PTPObjectFormatCodeHTML"},
    {0x3006, "PTPObjectFormatCodeDPOF"},
    {0x3007, "PTPObjectFormatCodeAIFF"},
    {0x3008, "PTPObjectFormatCodeWAV"},
    {0x3009, "PTPObjectFormatCodeMP3"},
    {0x300A, "PTPObjectFormatCodeAVI"},
    {0x300B, "PTPObjectFormatCodeMPEG"},
    {0x300C, "PTPObjectFormatCodeASF"},
    {0x300D, "PTPObjectFormatCodeQT"},
    {0x300E, "PTPObjectFormatCodeXML"},
    {0x3800, "PTPObjectFormatCodeUndefinedImage"},
    {0x3801, "PTPObjectFormatCodeEXIF_JPEG"},
    {0x3802, "PTPObjectFormatCodeTIFF_EP"},
    {0x3803, "PTPObjectFormatCodeFlashPix"},
    {0x3804, "PTPObjectFormatCodeBMP"},
    {0x3805, "PTPObjectFormatCodeCIFF"},
    {0x3806, "PTPObjectFormatCodeReserved1"},
    {0x3807, "PTPObjectFormatCodeGIF"},
    {0x3808, "PTPObjectFormatCodeJFIF"},
    {0x3809, "PTPObjectFormatCodePCD"},
    {0x380A, "PTPObjectFormatCodePICT"},
    {0x380B, "PTPObjectFormatCodePNG"},
    {0x380C, "PTPObjectFormatCodeReserved2"},
    {0x380D, "PTPObjectFormatCodeTIFF"},
    {0x380E, "PTPObjectFormatCodeTIFF_IT"},
    {0x380F, "PTPObjectFormatCodeJP2"},
    {0x3810, "PTPObjectFormatCodeJPX"},
};

constexpr PTPCodeName kFunctionalModes[] = {
    {0x0000, "PTPFunctionalModeStandard"},
    {0x0001, "PTPFunctionalModeSleepState"},
};

constexpr PTPCodeName kStorageTypes[] = {
    {0x0000, "PTPStorageTypeUndefined"},
    {0x0001, "PTPStorageTypeFixedROM"},
    {0x0002, "PTPStorageTypeRemovableROM"},
    {0x0003, "PTPStorageTypeFixedRAM"},
    {0x0004, "PTPStorageTypeRemovableRAM"},
};

constexpr PTPCodeName kFilesystemTypes[] = {
    {0x0000, "PTPFilesystemTypeUndefined"},
    {0x0001, "PTPFilesystemTypeGenericFlat"},
    {0x0002, "PTPFilesystemTypeGenericHierarchical"},
    {0x0003, "PTPFilesystemTypeDCF"},
};

constexpr PTPCodeName kAccessCapabilities[] = {
    {0x0000, "PTPAccessCapabilityReadWrite"},
    {0x0001, "PTPAccessCapabilityReadOnlyWithoutObjectDeletion"},
    {0x0002, "PTPAccessCapabilityReadOnlyWithObjectDeletion"},
};

constexpr PTPCodeName kProtectionStatuses[] = {
    {0x0000, "PTPProtectionStatusNoProtection"},
    {0x0001, "PTPProtectionStatusReadOnly"},
};

constexpr PTPCodeName kAssociationTypes[] = {
    {0x0000, "PTPAssociationTypeUndefined"},
    {0x0001, "PTPAssociationTypeGenericFolder"},
    {0x0002, "PTPAssociationTypeAlbum"},
    {0x0003, "PTPAssociationTypeTimeSequence"},
    {0x0004, "PTPAssociationTypeHorizontalPanoramic"},
    {0x0005, "PTPAssociationTypeVerticalPanoramic"},
    {0x0006, "PTPAssociationType2DPanoramic"},
    {0x0007, "PTPAssociationTypeAncillaryData"},
};

constexpr PTPCodeName kInitFailReasons[] = {
    {0x0001, "PTPInitFailReasonRejectedInitiator"},
    {0x0002, "PTPInitFailReasonBusy"},
    {0x0003, "PTPInitFailReasonUnspecified"},
};
// clang-format on

}  // namespace

std::span<const PTPCodeName> responseCodes() { return kResponses; }
std::span<const PTPCodeName> eventCodes() { return kEvents; }
std::span<const PTPCodeName> devicePropCodes() { return kDeviceProperties; }
std::span<const PTPCodeName> objectFormatCodes() { return kObjectFormats; }
std::span<const PTPCodeName> functionalModes() { return kFunctionalModes; }
std::span<const PTPCodeName> storageTypes() { return kStorageTypes; }
std::span<const PTPCodeName> filesystemTypes() { return kFilesystemTypes; }
std::span<const PTPCodeName> accessCapabilities() { return kAccessCapabilities; }
std::span<const PTPCodeName> protectionStatuses() { return kProtectionStatuses; }
std::span<const PTPCodeName> associationTypes() { return kAssociationTypes; }
std::span<const PTPCodeName> initFailReasons() { return kInitFailReasons; }

}  // namespace brivo
