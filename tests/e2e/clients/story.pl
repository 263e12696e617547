#!/usr/bin/perl
# A client with SOAP::Lite, told nothing but where the description is.
#
#   perl story.pl WSDL SCENE    ends with status 0 when everything was answered as it should be
use strict;
use warnings;

use SOAP::Lite;

my $failures = 0;

sub check {
    my ($holds, $what) = @_;
    return if $holds;
    print STDERR "$what\n";
    ++$failures;
}

my ($wsdl, $scene) = @ARGV;
my $service = SOAP::Schema->schema_url($wsdl)->parse->services->{KovaService};
my $address = $service->{QueryDisksForKova}{endpoint}->value;
my $soap = SOAP::Lite->proxy($address)->default_ns('urn:nox')->on_action(sub { "\"$_[0]#$_[1]\"" })
    ->on_fault(sub { return $_[1] });

# A field, of texts or of other fields.
sub field {
    my ($name, @content) = @_;
    my $data = SOAP::Data->name($name);
    return ref $content[0] ? $data->value(\SOAP::Data->value(@content)) : $data->type('')->value(@content);
}

# The answer, whatever it is.
sub call {
    my ($operation, @fields) = @_;
    my $answer = $soap->call(SOAP::Data->name($operation)->attr({xmlns => 'urn:nox'}), @fields);
    check(ref $answer && $answer->isa('SOAP::SOM'), "$operation is answered");
    return $answer;
}

sub done {
    my $answer = call(@_);
    check(!$answer->fault, "$_[0]: " . ($answer->faultstring // ''));
    return $answer;
}

sub names {
    my ($answer, $path) = @_;
    return join ' ', $answer->valueof("//$path/canonicalName");
}

sub groups { return done('GetStorageInfo') }
sub by_name { return field($_[0], field('canonicalName', $_[1])) }

my %scenes = (
    story => sub {
        my $disks = done('QueryDisksForKova');
        check(names($disks, 'result/disk') eq 'naa.f1 naa.f2 naa.c1 naa.c2 naa.c3 naa.c4 naa.u1 naa.p1', 'disks');
        check($disks->valueof('//result/state') eq 'eligible', 'the first is eligible');

        my $made = done('AddAllEligibleDisks', field('label', 'the first'));
        check(names($made, 'result/mapping/ssd') eq 'naa.f1 naa.f2', 'two groups are made');
        check($made->valueof('//task'), 'a change tells its task');
        check(names(groups(), 'diskMapping/nonSsd') eq 'naa.c1 naa.c3 naa.c2 naa.c4', 'with these disks');

        done('UnmountDiskMapping', field('mappings', by_name('ssd', 'naa.f1'), by_name('nonSsd', 'naa.c1'),
                                         by_name('nonSsd', 'naa.c3')));
        check(names(groups(), 'diskMapping/ssd') eq 'naa.f2', 'one group is left');
        done('ClaimUnmountedDiskgroup');
        check(names(groups(), 'diskMapping/ssd') eq 'naa.f1 naa.f2', 'it is back');
        done('RemoveDisk', field('disk', 'naa.c1'));
        check(names(groups(), 'diskMapping/nonSsd') eq 'naa.c3 naa.c2 naa.c4', 'a disk is removed');
        done('RemoveDiskMapping', field('mapping', by_name('nonSsd', 'naa.c3'), by_name('ssd', 'naa.f1')));
        check(names(groups(), 'diskMapping/ssd') eq 'naa.f2', 'a group is removed');
        done('AddDisks', by_name('disks', 'naa.f1'), by_name('disks', 'naa.c1'));
        check(names(groups(), 'diskMapping/ssd') eq 'naa.f2 naa.f1', 'disks are added by their names');
    },
    faults => sub {
        my $few = call('InitializeDisks');
        check(ref $few->faultdetail->{fault} eq 'InsufficientDisks', 'the type: ' . ref $few->faultdetail->{fault});
        check($few->faultstring =~ /too few disks/, 'in words: ' . $few->faultstring);
        my $refused = call('QueryDisksForKova', field('names', "naa.1\n"));
        my $fault = $refused->faultdetail->{fault};
        check(ref $fault eq 'InvalidArgument' && $fault->{argument} eq 'names[0]', 'a name that is none');
        my $parted = done('InitializeDisks', field('mappings', by_name('ssd', 'naa.f1'), by_name('nonSsd', 'naa.p1')));
        check($parted->valueof('//InitializeDisksResponse/fault')->{device} eq 'naa.p1', 'a parted disk');
    },
    part => sub {
        my $answer = done('AddAllEligibleDisks');
        check($answer->valueof('//AddAllEligibleDisksResponse/fault')->{reason} eq 'it does not answer', 'what failed');
        check(join(' ', map { exists $_->{error} ? 'failed' : 'made' } $answer->valueof('//result')) eq 'made failed',
              'the second group failed');
    },
    absent => sub {
        my ($gone) = grep { /^kova:/ } done('QueryDisksForKova')->valueof('//result/disk/canonicalName');
        done('RemoveDisk', field('disk', $gone));
        check(names(groups(), 'diskMapping/nonSsd') eq 'naa.c2', 'it is removed');
    },
    read => sub {
        check(names(done('QueryDisksForKova'), 'result/disk') =~ /^naa\.f1 /, 'disks');
        my $refused = call('ClaimUnmountedDiskgroup');
        check(ref $refused->faultdetail->{fault} eq 'NotPermitted', 'reading only');
    },
);
$scenes{$scene}->();
exit($failures == 0 ? 0 : 1);
