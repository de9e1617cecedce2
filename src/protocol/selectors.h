// SPDX-License-Identifier: MIT
// The selectors of the protocols, as code names them.
#pragma once

#include <string_view>

namespace brivo::selectors {

// Device manager.
inline constexpr std::string_view kRequestDeviceList = "requestDeviceListWithReply:";
inline constexpr std::string_view kOpenDevice = "openDevice:withReply:";
inline constexpr std::string_view kCloseDevice = "closeDevice:withReply:";
inline constexpr std::string_view kNotifyAddedDevice = "notifyAddedDevice:";
inline constexpr std::string_view kNotifyRemovedDevice = "notifyRemovedDevice:";

// Device.
inline constexpr std::string_view kOpenDeviceSession = "openDeviceSessionWithReply:";
inline constexpr std::string_view kSendPTPCommand = "sendPTPCommand:andPayload:withReply:";
inline constexpr std::string_view kRequestMetadata = "requestMetadataForObjectHandle:options:withReply:";
inline constexpr std::string_view kRequestThumbnail =
    "requestThumbnailDataForObjectHandle:options:withReply:";
inline constexpr std::string_view kRequestDownload = "requestDownloadObjectHandle:options:withReply:";
inline constexpr std::string_view kRequestReadData = "requestReadDataFromObjectHandle:options:withReply:";
inline constexpr std::string_view kOrvidEvent = "orvidEventNotification:completion:";
inline constexpr std::string_view kRequestDelete = "requestDeleteObjectHandle:options:withReply:";
inline constexpr std::string_view kRequestStartUsing = "requestStartUsingDeviceWithReply:";
inline constexpr std::string_view kEnumerateContent = "enumerateContentWithOptions:";
inline constexpr std::string_view kPtpEventForwarding = "ptpEventForwarding:";
inline constexpr std::string_view kRegisterInterests = "registerInterestedEventNotifications:";
inline constexpr std::string_view kUnregisterInterests = "unregisterInterestedEventNotifications:";
inline constexpr std::string_view kPostNotification = "postNotification:";
inline constexpr std::string_view kNotifyAddedItems = "notifyAddedItems:";
inline constexpr std::string_view kNotifyPtpEvent = "notifyPtpEvent:";
inline constexpr std::string_view kNotifyPercentCompleted = "notifyContentCatalogPercentCompleted:";
inline constexpr std::string_view kNotifyDeviceClose = "notifyDeviceCloseWithUSBLocationID:";

// The door on the session bus.
inline constexpr std::string_view kDoorOpenManager = "OpenManager";
inline constexpr std::string_view kDoorOpenDevice = "OpenDevice";

}  // namespace brivo::selectors
