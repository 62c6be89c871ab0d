#include "rasters/file_verb.h"

#include <iostream>

#include "platform/durability.h"

namespace lumo::host {

void FileVerb::AddOverwriteTo(OptionSet& line, const char* replaced) {
  line.Add("--overwrite", overwrite_, std::string("Replace ") + replaced);
}

void FileVerb::AddLastOptions(OptionSet& line) {
  AddDurableTo(line, isDurable_);
  job_.AddTo(line);
  job_.AddProgressTo(line);
}

/// The files that the command line names as read.
std::vector<std::string> FileVerb::GetInputs() const {
  std::vector<std::string> inputs = GetFurtherInputs();
  inputs.push_back(source_.file);
  for (const std::string& file : area_.GetFiles()) inputs.push_back(file);
  return inputs;
}

RasterInfo FileVerb::PlanArea(JobSession& session, const OpenRaster& whole) {
  const RasterInfo info = area_.Plan(session, whole.uri, whole.info, source_.file);
  const std::string area = area_.Describe(whole.info);
  if (!area.empty() && !job_.quiet) Say(source_.file + ": " + area);
  return info;
}

FileVerb::OpenRaster FileVerb::ShowArea(JobSession& session, const OpenRaster& whole) {
  if (!area_.IsGiven()) return whole;
  const RasterInfo info = PlanArea(session, whole);
  JobDraft draft;
  RasterChain chain(draft, whole.uri);
  area_.AddViews(chain);
  const std::string top = chain.GetTop().ToUTF8();
  if (!top.starts_with('$')) return {whole.uri, info};  // all of it
  return {session.Run(draft).Find(String(top.substr(1))).returns.Find("URI"), info};
}

/// Refuses outputs that are what the sources turned out to be.
void FileVerb::RefuseOpened(const JobDraft& draft, const JobResults& opened,
                            Outputs& outputs) const {
  for (const JobDraft::StepInfo& step : draft.GetSteps()) {
    if (step.opens.GetLength() == 0) continue;
    const std::string path = PathOf(opened.Find(step.name).returns.Find(step.output));
    if (!path.empty()) outputs.RefuseInput(path);
  }
}

int FileVerb::Run() {
  area_.Check();
  CheckOptions();
  JobSession session(job_);
  session.GetInterruption().SetLast();
  platform::SetDurable(isDurable_);
  const bool isServed = !job_.server.name.empty();
  Outputs outputs(session.GetInterruption(), {overwrite_, isDurable_ || isServed}, GetInputs());
  for (const std::string& file : GetOutputs()) outputs.Add(file);
  for (const std::string& file : GetChangedFiles()) {
    session.GetInterruption().Watch(file, file);
  }
  JobDraft opening;
  AddOpening(opening);
  const JobResults opened = session.Run(opening);
  RefuseOpened(opening, opened, outputs);
  Plan(session, opened);
  if (job_.printJob) {
    std::cout << GetJob(outputs).Write().ToUTF8() << '\n';
    return kExitSuccess;
  }
  std::vector<std::uint64_t> bytes;
  for (std::size_t i = 0; i < GetOutputs().size(); ++i) bytes.push_back(GetBytes(i));
  outputs.Begin(bytes);
  try {
    Make(session, outputs);
  } catch (const HostError& error) {
    throw HostError(error.code, outputs.InUsersWords(error.what()));
  }
  const std::string description = Describe(), remark = Remark();
  outputs.Commit([&] {
    session.CheckInterrupt();
    Save(session);
  });
  std::cout << description;
  if (!remark.empty()) Say(remark);
  session.GetInterruption().SetDone();
  if (session.IsInterrupted()) Say(session.GetInterruption().Describe());
  return kExitSuccess;
}

}  // namespace lumo::host
