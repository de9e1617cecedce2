// SPDX-License-Identifier: MIT
#pragma once

#include <optional>
#include <span>
#include <variant>

#include "ptp/containers.h"
#include "ptp/object_info_dataset.h"

namespace brivo {

/// A serialised dataset or what carries PTP.
using PTPRecord = std::variant<MSObjectInfoDataset, PTPContainer>;

/// Takes the record at the start of `bytes` off them. None, and nothing taken, when they begin with no whole
/// record. What it is shows at offset 4: a dataset has its content length there, which is larger than any
/// type of a container. The payload of a container stays in the caller's bytes. Pure and *thread-safe*.
std::optional<PTPRecord> takePTPRecord(std::span<const std::byte>& bytes);

}  // namespace brivo
