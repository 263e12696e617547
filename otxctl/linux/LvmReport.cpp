#include "otxctl/linux/LvmReport.h"

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
    const bool isMissing = !TextOf(row, "pv_missing").empty() || name.empty() || name.front() == '[';
    if (!isMissing) {
      volume.deviceNumber = TextOf(row, "pv_major") + ":" + TextOf(row, "pv_minor");
    }
    volume.groupName = TextOf(row, "vg_name");
    volume.groupUuid = TextOf(row, "vg_uuid");
    volume.tags = TagsOf(row, "pv_tags");
    volume.groupTags = TagsOf(row, "vg_tags");
    return volume;
  });
}

std::vector<LogicalVolume> ReadLogicalVolumes(std::string_view report) {
  return ReadRows<LogicalVolume>(report, "lv", [](const json& row) {
    TextOf(row, "lv_name");
    return LogicalVolume{TextOf(row, "vg_uuid"), TextOf(row, "lv_active") == "active"};
  });
}

}  // namespace OtxCtl::Linux
