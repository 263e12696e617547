#include "kovactl/change/ChangeCommand.h"

#include <ostream>

#include "kovactl/DiskGroups.h"
#include "kovactl/GroupResults.h"
#include "kovactl/Print.h"
#include "kovactl/plan/LeftOvers.h"
#include "tessa/text/Escape.h"

namespace Kovactl {
namespace {

using Tessa::Ref;

// Where the host has nothing to tell, what is left over says why.
void PrintSilence(const Host::ManagementApi& host, const Change& change, std::ostream& out) {
  out << Tessa::Escape(change.WordsForSilence()) << "\n";
  const std::optional<Texts> offered = change.OfferedDisks();
  const auto leftOver = offered ? ExplainLeftOvers(host, *offered) : std::vector<LeftOverDisk>();
  if (!leftOver.empty()) {
    out << "\n";
    PrintLeftOverCounts(leftOver, out);
    out << "\n`kovactl plan add` with --all-disks names them.\n";
  }
}

void PrintAnswer(const Host::ManagementApi& host, const Change& change, const Host::Answer& answer,
                 const std::string& output, std::ostream& out, std::ostream& err) {
  Ref<GroupResults> results(dynamic_cast<GroupResults*>(answer.result.Get()));
  const bool isSilent = !results && !answer.fault;
  if (isSilent && output == "table") {
    PrintSilence(host, change, out);
  } else if (isSilent && change.AnswersWithGroups()) {
    results = Tessa::MakeRef<GroupResults>();  // scripts can count on a list
  }
  if (results && output == "table") {
    PrintGroupResults(*results, change.Participle(), out);
  } else if (results) {
    PrintObject(*results, output, out);
  }
  PrintGroupFaults(results.Get(), answer.fault.Get(), err);
}

// Whether anything of the change may have come about.
bool MayHaveChanged(const Change& change, const Host::Answer& answer) {
  const auto* const results = dynamic_cast<const GroupResults*>(answer.result.Get());
  return results != nullptr ? !results->IsEmpty() : !answer.fault && !change.AnswersWithGroups();
}

}  // namespace

void NoteForgotten(const ChangeOptions& options, std::ostream& err) {
  if (options.forgotten) {
    err << "(not saved: give --save to keep the change)\n";
  }
  if (options.dryRun) {
    err << "(dry run: nothing was changed)\n";
  }
}

ExitStatus RunChange(const Host::ManagementApi& host, Change& change, const Consent& consent,
                     const ChangeOptions& options, std::ostream& out, std::ostream& err) {
  if (change.Destroys()) {
    consent.Require();
  }
  if (const Ref<Orbis::MethodFault> fault = change.LookAt(host)) {
    PrintFault(*fault, err);
    return ExitStatus::Fault;
  }
  const Texts atRisk = change.DisksAtRisk();
  if (!atRisk.empty() && !consent.AskFor(atRisk)) {
    err << "Nothing was changed.\n";
    return ExitStatus::BadInput;
  }
  const Host::Answer answer = change.Make(host);
  PrintAnswer(host, change, answer, options.output, out, err);
  if (MayHaveChanged(change, answer)) {
    NoteForgotten(options, err);
  }
  return answer.fault ? ExitStatus::Fault : ExitStatus::Done;
}

}  // namespace Kovactl
