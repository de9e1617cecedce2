// SPDX-License-Identifier: MIT
#include "brivoctl/record_json.h"

#include "brivoctl/hexadecimal.h"
#include "ptp/code_names.h"

namespace brivoctl {

namespace {

using brivo::MSObjectInfoDataset;
using brivo::PTPContainer;

std::string nameOfCode(const PTPContainer& container) {
  switch (container.codeKind) {
    case PTPContainer::CodeKind::operation:
      return brivo::stringForOperationCode(container.code);
    case PTPContainer::CodeKind::response:
      return brivo::stringForResponseCode(container.code);
    case PTPContainer::CodeKind::event:
      return brivo::stringForEventCode(container.code);
    case PTPContainer::CodeKind::none:
      break;
  }
  return {};
}

Json jsonOfDataset(const MSObjectInfoDataset& dataset) {
  return {{"record", "object info dataset"},
          {"objectHandle", dataset.objectHandle()},
          {"objectFormat", dataset.objectFormat()},
          {"objectFormatName", brivo::stringForObjectFormatCode(dataset.objectFormat())},
          {"protectionStatus", dataset.protectionStatus()},
          {"protectionStatusName", brivo::stringForProtectionStatus(dataset.protectionStatus())},
          {"objectCompressedSize", dataset.objectCompressedSize()},
          {"thumbFormat", dataset.thumbFormat()},
          {"thumbCompressedSize", dataset.thumbCompressedSize()},
          {"thumbOffset", dataset.thumbOffset()},
          {"thumbPixWidth", dataset.thumbPixWidth()},
          {"thumbPixHeight", dataset.thumbPixHeight()},
          {"imagePixWidth", dataset.imagePixWidth()},
          {"imagePixHeight", dataset.imagePixHeight()},
          {"imageBitDepth", dataset.imageBitDepth()},
          {"parentObject", dataset.parentObject()},
          {"associationType", dataset.associationType()},
          {"associationTypeName", brivo::stringForAssociationType(dataset.associationType())},
          {"imageOrietation", dataset.imageOrietation()},
          {"captureDate_tvsec", dataset.captureDate_tvsec()},
          {"modificationDate_tvsec", dataset.modificationDate_tvsec()},
          {"filename", dataset.filename()}};
}

template <class Field>
void set(Json& json, const char* key, const std::optional<Field>& field) {
  if (field) json[key] = *field;
}

Json jsonOfContainer(const PTPContainer& container) {
  const bool isIP = container.carrier == PTPContainer::Carrier::ip;
  Json json{{"record", isIP ? "PTP/IP packet" : "PTP USB container"},
            {"type", container.type},
            {"typeName", brivo::nameOfPTPContainerType(container)},
            {"length", container.length}};
  set(json, "dataPhase", container.dataPhase);
  set(json, "connection", container.connection);
  if (container.codeKind != PTPContainer::CodeKind::none) {
    json["code"] = container.code;
    json["codeName"] = nameOfCode(container);
  }
  set(json, "transaction", container.transaction);
  if (!container.parameters.empty()) json["parameters"] = container.parameters;
  if (container.guid) json["guid"] = hexOf(*container.guid);
  set(json, "name", container.name);
  set(json, "version", container.version);
  set(json, "reason", container.reason);
  if (container.reason) json["reasonName"] = brivo::stringForInitFailReason(*container.reason);
  set(json, "totalLength", container.totalLength);
  if (container.payload) {
    json["payloadLength"] = container.payload->size();
    json["payload"] = hexOf(*container.payload);
  }
  return json;
}

}  // namespace

Json jsonOf(const brivo::PTPRecord& record) {
  if (const auto* const dataset = std::get_if<MSObjectInfoDataset>(&record)) return jsonOfDataset(*dataset);
  return jsonOfContainer(std::get<PTPContainer>(record));
}

}  // namespace brivoctl
