#include "otxctl/linux/LvmReport.h"

#include <algorithm>
#include <charconv>
#include <nlohmann/json.hpp>

#include "tessa/text/Escape.h"

namespace OtxCtl::Linux {
namespace {

using nlohmann::json;

// Warnings end up around the report where somebody has joined the two outputs.
json ParseReport(std::string_view report) {
  const std::size_t first = report.find('{');
  const std::size_t last = report.rfind('}');
  if (first == std::string_view::npos || last == std::string_view::npos || last < first) {
    throw BadReport("the volume manager gave no report");
  }
  json document = json::parse(report.substr(first, last + 1 - first), nullptr, false);
  if (document.is_discarded()) {
    throw BadReport("the volume manager's report is no JSON");
  }
  return document;
}

std::string TextOf(const json& row, const char* column) {
  const auto found = row.find(column);
  if (found == row.end() || !found->is_string()) {
    throw BadReport("the volume manager's report has no column " + std::string(column));
  }
  return Tessa::Sanitize(found->get_ref<const std::string&>());
}

// Whole numbers; what is empty is 0.
std::int64_t NumberOf(const json& row, const char* column) {
  const std::string text = TextOf(row, column);
  std::int64_t number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (!text.empty() && (error != std::errc() || end != text.data() + text.size())) {
    throw BadReport("the volume manager's report has no number in column " + std::string(column));
  }
  return number;
}

std::vector<std::string> TagsOf(const json& row, const char* column) {
  std::vector<std::string> tags;
  std::string text = TextOf(row, column);
  for (std::size_t start = 0; start < text.size();) {
    const std::size_t end = std::min(text.find(',', start), text.size());
    if (end > start) {
      tags.push_back(text.substr(start, end - start));
    }
    start = end + 1;
  }
  return tags;
}

// {"report": [{"pv": [{..}, ..]}, ..]}
template <typename Row, typename Read>
std::vector<Row> ReadRows(std::string_view report, const char* kind, Read read) {
  const json document = ParseReport(report);
  const auto parts = document.find("report");
  if (!document.is_object() || parts == document.end() || !parts->is_array()) {
    throw BadReport("the volume manager's report has no part \"report\"");
  }
  std::vector<Row> rows;
  for (const json& part : *parts) {
    const auto list = part.is_object() ? part.find(kind) : part.end();
    if (!part.is_object() || list == part.end() || !list->is_array()) {
      throw BadReport("the volume manager's report has no part \"" + std::string(kind) + "\"");
    }
    for (const json& row : *list) {
      if (!row.is_object()) {
        throw BadReport("the volume manager's report has a row that is none");
      }
      rows.push_back(read(row));
    }
  }
  return rows;
}

}  // namespace

std::vector<PhysicalVolume> ReadPhysicalVolumes(std::string_view report) {
  return ReadRows<PhysicalVolume>(report, "pv", [](const json& row) {
    PhysicalVolume volume;
    const std::string name = TextOf(row, "pv_name");
    if (!name.empty() && name.front() != '[') {
      volume.deviceNumber = TextOf(row, "pv_major") + ":" + TextOf(row, "pv_minor");
      volume.isLeftBehind = !TextOf(row, "pv_missing").empty();
    }
    volume.groupName = TextOf(row, "vg_name");
    volume.groupUuid = TextOf(row, "vg_uuid");
    volume.extents = NumberOf(row, "pv_pe_count");
    volume.tags = TagsOf(row, "pv_tags");
    volume.groupTags = TagsOf(row, "vg_tags");
    return volume;
  });
}

std::vector<LogicalVolume> ReadLogicalVolumes(std::string_view report) {
  auto volumes = ReadRows<LogicalVolume>(report, "lv", [](const json& row) {
    LogicalVolume volume;
    volume.groupUuid = TextOf(row, "vg_uuid");
    volume.name = TextOf(row, "lv_name");
    volume.path = TextOf(row, "lv_path");
    volume.bytes = NumberOf(row, "lv_size");
    volume.tags = TagsOf(row, "lv_tags");
    volume.kind = TextOf(row, "segtype");
    volume.isActive = TextOf(row, "lv_active") == "active";
    volume.isOpen = TextOf(row, "lv_device_open") == "open";
    volume.cacheMode = TextOf(row, "cache_mode");
    volume.usedBlocks = NumberOf(row, "cache_used_blocks");
    volume.cacheBlocks = NumberOf(row, "cache_total_blocks");
    return volume;
  });
  // The rows of one volume stand together.
  const auto isSame = [](const LogicalVolume& one, const LogicalVolume& other) {
    return one.groupUuid == other.groupUuid && one.name == other.name;
  };
  volumes.erase(std::unique(volumes.begin(), volumes.end(), isSame), volumes.end());
  return volumes;
}

}  // namespace OtxCtl::Linux
