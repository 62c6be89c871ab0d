#include "commands/client.h"

#include "commands/server.h"

namespace lumo {

PipeClient::PipeClient(const String& name, double patience)
    : dispatchPipe_(name), patience_(patience), note_("") {}

PipeClient::~PipeClient() {
  PipeClient::Disconnect();
}

String PipeClient::GetName() const {
  return dispatchPipe_.GetName() + "::" + (IsConnected() ? serverPipe_->GetName() : String("NULL"));
}

bool PipeClient::Connect() {
  if (IsConnected()) return true;
  if (!dispatchPipe_.ConnectWithin(patience_)) return false;
  String name;
  if (dispatchPipe_.Write(kNewServerWord) != 0 && dispatchPipe_.Read(name) != 0) {
    serverPipe_.Reset(new NamedPipe(name));
    serverGone_ = false;
  }
  return IsConnected();
}

void PipeClient::Disconnect() {
  if (serverPipe_.IsNull() || !serverPipe_->ConnectWithin(serverGone_ ? 0.0 : patience_)) return;
  serverPipe_->Write(kQuitWord);
  serverPipe_.Reset();
}

void PipeClient::Shutdown() {
  if (dispatchPipe_.ConnectWithin(patience_)) dispatchPipe_.Write(kQuitWord);
}

bool PipeClient::Send(const String& request, String& reply) {
  reply = "";
  if (!IsConnected()) return false;
  const bool answered = serverPipe_->ConnectWithin(serverGone_ ? 0.0 : patience_) &&
                        serverPipe_->Write(request) != 0 && serverPipe_->Read(reply) != 0;
  serverGone_ = !answered;
  return answered;
}

Map<String, JobResult> PipeClient::Submit(const String& jobDocument) {
  Map<String, JobResult> results;
  String reply;
  if (!Send(jobDocument, reply)) return results;
  JobResultParser(results).Parse(reply);
  return results;
}

}  // namespace lumo
