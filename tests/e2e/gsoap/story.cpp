// A client made from the service's description by a generator of another house. It is built and run by
// gsoap_test.py, beside the generated code, and is no part of the product.
//
//   story SCENE [CERTIFICATE-AND-KEY CA]    ends with status 0 when everything was answered as it should be
//
// The address is the one that stands in the description.

#include <iostream>
#include <map>
#include <string>
#include <vector>

#include "KovaBinding.nsmap"
#include "soapKovaBindingProxy.h"

namespace {

int failures = 0;

void Check(bool holds, const char* what, int line) {
  if (!holds) {
    std::cerr << "line " << line << ": " << what << "\n";
    ++failures;
  }
}
#define CHECK(condition) Check((condition), #condition, __LINE__)

class Client {
 public:
  Client() = default;
  Client(const char* certificate, const char* ca) {
    CHECK(soap_ssl_client_context(_proxy.soap, SOAP_SSL_DEFAULT, certificate, nullptr, ca, nullptr,
                                  nullptr) == SOAP_OK);
  }
  ~Client() { _proxy.destroy(); }

  std::vector<ns1__KovaHostDiskResult*> Disks() {
    _ns1__QueryDisksForKova request;
    CHECK(_proxy.QueryDisksForKova(&request, _disks) == SOAP_OK);
    return _disks.result;
  }
  ns1__KovaHostDiskResult* Disk(const std::string& name) {
    for (ns1__KovaHostDiskResult* result : Disks()) {
      if (*result->disk->canonicalName == name) {
        return result;
      }
    }
    CHECK(!"the disk is listed");
    return nullptr;
  }
  // Cache disk: number of capacity disks.
  std::map<std::string, std::size_t> Groups() {
    _ns1__GetStorageInfo request;
    CHECK(_proxy.GetStorageInfo(&request, _storage) == SOAP_OK);
    std::map<std::string, std::size_t> groups;
    for (ns1__KovaHostDiskMapping* mapping : _storage.result->diskMapping) {
      groups[*mapping->ssd->canonicalName] = mapping->nonSsd.size();
    }
    return groups;
  }
  _ns1__AddAllEligibleDisksResponse& AddAll() {
    _ns1__AddAllEligibleDisks request;
    CHECK(_proxy.AddAllEligibleDisks(&request, _added) == SOAP_OK);
    return _added;
  }
  // The type of the fault that the last call ended in.
  template <class Fault>
  const Fault* FaultAs() {
    const SOAP_ENV__Fault* const fault = _proxy.soap_fault();
    return fault == nullptr || fault->detail == nullptr
               ? nullptr
               : dynamic_cast<const Fault*>(fault->detail->ns1__fault);
  }
  KovaBindingProxy& Proxy() { return _proxy; }

 private:
  KovaBindingProxy _proxy;
  _ns1__QueryDisksForKovaResponse _disks;
  _ns1__GetStorageInfoResponse _storage;
  _ns1__AddAllEligibleDisksResponse _added;
};

using Groups = std::map<std::string, std::size_t>;

void TellTheStory(Client& client) {
  CHECK(client.Disks().size() == 8);
  CHECK(client.Disk("naa.f1")->state == "eligible");
  CHECK(dynamic_cast<ns1__DiskIsUSB*>(client.Disk("naa.u1")->error) != nullptr);
  const auto* const parted = dynamic_cast<ns1__DiskHasPartitions*>(client.Disk("naa.p1")->error);
  CHECK(parted != nullptr && parted->device != nullptr && *parted->device == "naa.p1");

  const auto& added = client.AddAll();
  CHECK(added.fault == nullptr && added.result.size() == 2);
  CHECK(added.task != nullptr && !added.task->empty());
  CHECK((client.Groups() == Groups{{"naa.f1", 2}, {"naa.f2", 2}}));

  _ns1__GetConfigInfo configRequest;
  _ns1__GetConfigInfoResponse config;
  CHECK(client.Proxy().GetConfigInfo(&configRequest, config) == SOAP_OK);
  CHECK(config.result->faultDomainInfo->name == "rack-1");

  ns1__KovaHostDiskMapping mapping = *added.result[0]->mapping;
  _ns1__UnmountDiskMapping unmount;
  unmount.mappings.push_back(&mapping);
  _ns1__UnmountDiskMappingResponse unmounted;
  CHECK(client.Proxy().UnmountDiskMapping(&unmount, unmounted) == SOAP_OK);
  CHECK(unmounted.result.size() == 1 && unmounted.fault == nullptr);
  CHECK((client.Groups() == Groups{{"naa.f2", 2}}));

  _ns1__ClaimUnmountedDiskgroup claim;
  _ns1__ClaimUnmountedDiskgroupResponse claimed;
  CHECK(client.Proxy().ClaimUnmountedDiskgroup(&claim, claimed) == SOAP_OK);
  CHECK((client.Groups() == Groups{{"naa.f1", 2}, {"naa.f2", 2}}));

  _ns1__RemoveDisk remove;
  remove.disk = *mapping.nonSsd[0]->canonicalName;
  _ns1__RemoveDiskResponse removed;
  CHECK(client.Proxy().RemoveDisk(&remove, removed) == SOAP_OK && removed.fault == nullptr);
  CHECK((client.Groups() == Groups{{"naa.f1", 1}, {"naa.f2", 2}}));

  _ns1__RemoveDiskMapping removeGroup;
  removeGroup.mapping = &mapping;
  _ns1__RemoveDiskMappingResponse groupRemoved;
  CHECK(client.Proxy().RemoveDiskMapping(&removeGroup, groupRemoved) != SOAP_OK);  // as it was before
  CHECK(client.FaultAs<ns1__InvalidArgument>() != nullptr);
  mapping.nonSsd.erase(mapping.nonSsd.begin());
  CHECK(client.Proxy().RemoveDiskMapping(&removeGroup, groupRemoved) == SOAP_OK);
  CHECK((client.Groups() == Groups{{"naa.f2", 2}}));
}

void MeetAPartitionedDisk(Client& client) {
  ns1__HostScsiDisk ssd = *client.Disk("naa.f1")->disk;
  ns1__HostScsiDisk parted = *client.Disk("naa.p1")->disk;
  ns1__KovaHostDiskMapping mapping;
  mapping.ssd = &ssd;
  mapping.nonSsd.push_back(&parted);
  _ns1__InitializeDisks request;
  request.mappings.push_back(&mapping);
  _ns1__InitializeDisksResponse response;
  CHECK(client.Proxy().InitializeDisks(&request, response) == SOAP_OK);
  CHECK(response.result.size() == 1);
  CHECK(dynamic_cast<ns1__DiskHasPartitions*>(response.fault) != nullptr);

  request.mappings.clear();
  CHECK(client.Proxy().InitializeDisks(&request, response) != SOAP_OK);
  CHECK(client.FaultAs<ns1__InsufficientDisks>() != nullptr);
}

void FailInPart(Client& client) {
  const auto& added = client.AddAll();
  CHECK(added.result.size() == 2);
  CHECK(added.result[0]->error == nullptr && added.result[1]->error != nullptr);
  const auto* const fault = dynamic_cast<ns1__SystemError*>(added.fault);
  CHECK(fault != nullptr && fault->reason == "it does not answer");
}

void ReadOnly(Client& client) {
  CHECK(client.Disks().size() == 8);
  _ns1__ClaimUnmountedDiskgroup claim;
  _ns1__ClaimUnmountedDiskgroupResponse claimed;
  CHECK(client.Proxy().ClaimUnmountedDiskgroup(&claim, claimed) != SOAP_OK);
  CHECK(client.FaultAs<ns1__NotPermitted>() != nullptr);
}

void MissADisk(Client& client) {
  ns1__KovaHostDiskResult* gone = nullptr;
  for (ns1__KovaHostDiskResult* result : client.Disks()) {
    gone = result->disk->canonicalName->rfind("kova:", 0) == 0 ? result : gone;
  }
  CHECK(gone != nullptr && gone->state == "inUse");
  _ns1__RemoveDisk remove;
  remove.disk = *gone->disk->canonicalName;
  _ns1__RemoveDiskResponse removed;
  CHECK(client.Proxy().RemoveDisk(&remove, removed) == SOAP_OK);
  CHECK((client.Groups() == Groups{{"naa.f1", 1}}));
}

const std::map<std::string, void (*)(Client&)> scenes = {{"story", &TellTheStory},
                                                         {"partitioned", &MeetAPartitionedDisk},
                                                         {"part", &FailInPart},
                                                         {"absent", &MissADisk},
                                                         {"read", &ReadOnly}};

}  // namespace

int main(int argc, char** argv) {
  if ((argc != 2 && argc != 4) || scenes.count(argv[1]) == 0) {
    return 2;
  }
  soap_ssl_init();
  if (argc == 2) {
    Client client;
    scenes.at(argv[1])(client);
  } else {
    Client client(argv[2], argv[3]);
    scenes.at(argv[1])(client);
  }
  return failures == 0 ? 0 : 1;
}
