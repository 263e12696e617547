<?php
// A client of PHP's own SOAP extension, told nothing but where the description is.
//
//   php story.php WSDL SCENE    ends with status 0 when everything was answered as it should be
declare(strict_types=1);

$failures = 0;

function check(bool $holds, string $what): void {
    global $failures;
    if (!$holds) {
        fwrite(STDERR, "$what\n");
        $failures++;
    }
}

function connect(string $wsdl): SoapClient {
    return new SoapClient($wsdl, [
        'cache_wsdl' => WSDL_CACHE_NONE,
        'features' => SOAP_SINGLE_ELEMENT_ARRAYS,
        'classmap' => ['DiskHasPartitions' => 'DiskHasPartitions', 'InsufficientDisks' => 'InsufficientDisks',
                       'InvalidArgument' => 'InvalidArgument', 'NotPermitted' => 'NotPermitted',
                       'SystemError' => 'SystemError', 'DiskIsUSB' => 'DiskIsUSB'],
    ]);
}

#[AllowDynamicProperties] class DiskHasPartitions {}
#[AllowDynamicProperties] class InsufficientDisks {}
#[AllowDynamicProperties] class InvalidArgument {}
#[AllowDynamicProperties] class NotPermitted {}
#[AllowDynamicProperties] class SystemError {}
#[AllowDynamicProperties] class DiskIsUSB {}

/** Results by canonical name. */
function disks(SoapClient $client): array {
    $found = [];
    foreach ($client->QueryDisksForKova()->result as $result) {
        $found[$result->disk->canonicalName] = $result;
    }
    return $found;
}

/** Cache disk: capacity disks, of the mounted groups. */
function groups(SoapClient $client): array {
    $found = [];
    foreach ($client->GetStorageInfo()->result->diskMapping ?? [] as $mapping) {
        $found[$mapping->ssd->canonicalName] = array_map(fn($disk) => $disk->canonicalName, $mapping->nonSsd);
    }
    return $found;
}

/** The exception that the call ends in. */
function fault_of(callable $call): ?SoapFault {
    try {
        $call();
    } catch (SoapFault $fault) {
        return $fault;
    }
    check(false, 'there is a fault');
    return null;
}

/** The typed fault that the call ends in; its words stand in $words. */
function typed_fault_of(callable $call, ?string &$words = null): object {
    $fault = fault_of($call);
    $words = $fault->getMessage();
    $typed = $fault->detail->fault;
    return $typed instanceof SoapVar ? $typed->enc_value : $typed;
}

function story(SoapClient $client): void {
    $disks = disks($client);
    check(count($disks) === 8, 'eight disks');
    check($disks['naa.f1']->state === 'eligible' && $disks['naa.f1']->disk->ssd === true, 'a flash disk');
    check($disks['naa.u1']->error instanceof DiskIsUSB, 'a disk on USB');

    $made = $client->AddAllEligibleDisks(['label' => 'the first']);
    check(!isset($made->fault) && count($made->result) === 2, 'two groups are made');
    check($made->task !== '', 'a change tells its task');
    check(groups($client) === ['naa.f1' => ['naa.c1', 'naa.c3'], 'naa.f2' => ['naa.c2', 'naa.c4']], 'groups');
    check($client->GetConfigInfo()->result->faultDomainInfo->name === 'rack-1', 'the fault domain');

    $mapping = $made->result[0]->mapping;
    $unmounted = $client->UnmountDiskMapping(['mappings' => [$mapping]]);  // as it came
    check(!isset($unmounted->fault), 'a group is unmounted');
    check(array_keys(groups($client)) === ['naa.f2'], 'one group is left');
    $client->ClaimUnmountedDiskgroup();
    check(array_keys(groups($client)) === ['naa.f1', 'naa.f2'], 'it is back');

    $client->RemoveDisk(['disk' => 'naa.c1']);
    check(groups($client)['naa.f1'] === ['naa.c3'], 'a disk is removed');
    $client->RemoveDiskMapping(['mapping' => ['ssd' => ['canonicalName' => 'naa.f1'],
                                              'nonSsd' => [['canonicalName' => 'naa.c3']]],
                                'optionText' => 'o', 'optionFirst' => 1]);
    check(array_keys(groups($client)) === ['naa.f2'], 'a group is removed');
    $added = $client->AddDisks(['disks' => [['canonicalName' => 'naa.f1'], ['canonicalName' => 'naa.c1']]]);
    check(count($added->result) === 1 && groups($client)['naa.f1'] === ['naa.c1'], 'disks are added by their names');
}

function faults(SoapClient $client): void {
    $few = typed_fault_of(fn() => $client->InitializeDisks(['mappings' => []]), $words);
    check($few instanceof InsufficientDisks, 'too few disks: ' . get_class($few));
    check(str_contains($words, 'too few disks'), "in words: $words");
    $group = ['ssd' => ['canonicalName' => 'naa.f1'], 'nonSsd' => [['canonicalName' => 'naa.p1']]];
    $answer = $client->InitializeDisks(['mappings' => [$group]]);
    check($answer->fault instanceof DiskHasPartitions && $answer->fault->device === 'naa.p1', 'a parted disk');
    $refused = typed_fault_of(fn() => $client->QueryDisksForKova(['names' => ["naa.1\n"]]));
    check($refused instanceof InvalidArgument && $refused->argument === 'names[0]', 'a name that is none');
}

function part(SoapClient $client): void {
    $answer = $client->AddAllEligibleDisks();
    check($answer->fault instanceof SystemError && $answer->fault->reason === 'it does not answer', 'what failed');
    check(!isset($answer->result[0]->error) && isset($answer->result[1]->error), 'the second group failed');
}

function absent(SoapClient $client): void {
    $gone = array_values(array_filter(array_keys(disks($client)), fn($name) => str_starts_with($name, 'kova:')));
    check(count($gone) === 1, 'one disk has left');
    $client->RemoveDisk(['disk' => $gone[0]]);
    check(groups($client) === ['naa.f1' => ['naa.c2']], 'it is removed');
}

function read(SoapClient $client): void {
    check(count(disks($client)) === 8, 'eight disks');
    $refused = typed_fault_of(fn() => $client->ClaimUnmountedDiskgroup());
    check($refused instanceof NotPermitted && $refused->role === 'change', 'reading only');
}

[, $wsdl, $scene] = $argv;
$scene(connect($wsdl));
exit($failures === 0 ? 0 : 1);
