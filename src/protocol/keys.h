// SPDX-License-Identifier: MIT
// The keys of the dictionaries that the service and its clients exchange. docs/wire.md explains them.
#pragma once

#include <string_view>

namespace brivo::keys {

// Device contexts, the device list and open replies.
inline constexpr std::string_view kDeviceContexts = "OVDeviceContexts";
inline constexpr std::string_view kDevicePrimaryIdentifier = "OVDevicePrimaryIdentifier";
inline constexpr std::string_view kDeviceHandle = "OVDeviceHandle";
inline constexpr std::string_view kDeviceEndpoint = "OVDeviceEndpoint";
inline constexpr std::string_view kInternalDeviceUUID = "OVInternalDeviceUUID";

// The property dictionary of a device that was started.
inline constexpr std::string_view kDeviceName = "OVDeviceName";
inline constexpr std::string_view kDeviceEjectable = "OVDeviceEjectable";
inline constexpr std::string_view kDeviceLocked = "OVDeviceLocked";
inline constexpr std::string_view kDeviceUUIDString = "OVDeviceUUIDString";
inline constexpr std::string_view kDeviceAllowsSyncingClock = "OVDeviceAllowsSyncingClock";
inline constexpr std::string_view kDeviceTransportType = "OVDeviceTransportType";
inline constexpr std::string_view kDeviceProductType = "OVDeviceProductType";
inline constexpr std::string_view kDeviceVolumePath = "OVDeviceVolumePath";
inline constexpr std::string_view kDeviceStarted = "OVDeviceStarted";

// Options of an enumeration.
inline constexpr std::string_view kEnumerationPrioritizeSpeed = "OVEnumerationPrioritizeSpeed";
inline constexpr std::string_view kEnumerationChronologicalOrder = "OVEnumerationChronologicalOrder";

// Notifications.
inline constexpr std::string_view kType = "type";
inline constexpr std::string_view kDeviceIsReady = "OVDeviceIsReady";
inline constexpr std::string_view kDownloadProgress = "OVDownloadProgress";
inline constexpr std::string_view kObjectInfoArray = "OVMSObjectInfoArray";
inline constexpr std::string_view kNumberOfDownloadableObjects = "OVANumberOfDownloadableObjectsKey";
inline constexpr std::string_view kContentCatalogPercentCompleted = "OVAContentCatalogPercentCompletedKey";
inline constexpr std::string_view kNumberOfPreflightObjects = "OVANumberOfPreflightObjectsKey";
inline constexpr std::string_view kDownloadedBytes = "OVDownloadedBytes";
inline constexpr std::string_view kDownloadedPercent = "OVDownloadedPercent";
inline constexpr std::string_view kObjectID = "OVObjectID";

// Object requests and their results.
inline constexpr std::string_view kErrorCode = "errCode";
inline constexpr std::string_view kThumbnailMaxPixelSize = "OVThumbnailMaxPixelSize";
inline constexpr std::string_view kThumb = "thumb";
inline constexpr std::string_view kMetadata = "metadata";
inline constexpr std::string_view kReadOffset = "OVReadOffset";
inline constexpr std::string_view kReadLength = "OVReadLength";
inline constexpr std::string_view kReadBufferStreamOpen = "OVReadBufferStreamOpen";
inline constexpr std::string_view kReadBufferStreamClose = "OVReadBufferStreamClose";
inline constexpr std::string_view kReadData = "OVReadData";
inline constexpr std::string_view kReadBuffer = "OVReadBuffer";
inline constexpr std::string_view kReadBufferCount = "OVReadBufferCount";

}  // namespace brivo::keys
