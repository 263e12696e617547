// A host on which disk groups can be made, and the request for it.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "tests/support/OperationFixture.h"

namespace TestSupport {

// Three groups could be made: of s1 and a, s2 and b, s3 and c.
class InitializeFixture : public OperationFixture {
 protected:
  using Mapping = Tessa::Ref<Nox::Kova::Host::DiskMapping>;

  InitializeFixture() {
    SetHost({Ssd("s1"), Ssd("s2"), Ssd("s3"), Hdd("a"), Hdd("b"), Hdd("c")},
            {ARecord("s1").Ssd(), ARecord("s2").Ssd(), ARecord("s3").Ssd(), ARecord("a"), ARecord("b"),
             ARecord("c")});
  }

  void Initialize(const std::vector<Mapping>& mappings) { InitializeTexts(SoapTexts(mappings)); }
  void InitializeTexts(const std::vector<std::string>& texts) {
    _manager->InitializeDisks(texts, "tag", _faultText, _resultText);
  }
  void InitializeAll() { Initialize({_first, _second, _third}); }
  // What the kernel says of one disk from now on.
  void SetRecord(const HostCtl::Kova::DiskResult& record) {
    for (HostCtl::Kova::DiskResult& known : _kernel.records) {
      if (known.name == record.name) {
        known = record;
      }
    }
  }
  // The format of the group of that SSD does this.
  void WhenFormatting(const std::string& ssd, const std::function<void()>& does) {
    _kernel.onCall = [ssd, does](const KernelCall& call) {
      if (call.text.starts_with("FormatDiskMapping(" + ssd + ",")) {
        does();
      }
    };
  }
  std::vector<std::string> Formats() const { return Calls("FormatDiskMapping"); }

  const Mapping _first = AMapping(Ssd("s1"), {Hdd("a")});
  const Mapping _second = AMapping(Ssd("s2"), {Hdd("b")});
  const Mapping _third = AMapping(Ssd("s3"), {Hdd("c")});
};

}  // namespace TestSupport
