#pragma once

#include "commands/job_result.h"
#include "commands/named_pipe.h"

namespace lumo {

/// Sends jobs to a server. Used by one thread at a time.
///
///     PipeClient client("vexg");
///     if (!client.Connect()) return false;  // no server has that name
///     const Map<String, JobResult> results = client.Submit(document);
///     const bool well = results.Find("statistics").result == "Success";
class VEXG_EXPORT Client {
 public:
  using PointerRoot = Client;

  virtual ~Client() = default;

  /// The name of the server that it is connected to, for people.
  virtual String GetName() const = 0;
  /// True while there is a private server, as far as is known.
  virtual bool IsConnected() const = 0;

  /// Gets a private server; true at once when there is one already.
  virtual bool Connect() = 0;
  /// Ends the private server.
  virtual void Disconnect() = 0;
  /// Ends the dispatcher, so that no new clients are served; private servers go on.
  virtual void Shutdown() = 0;

  /// Sends a text to the private server and waits for its answer.
  /// @param reply  [out] the answer; "" when there is none.
  /// @return false without a private server, or when no answer came.
  virtual bool Send(const String& request, String& reply) = 0;

  /// Runs a job and gives the results of its commands by name; none when no answer came.
  virtual Map<String, JobResult> Submit(const String& jobDocument) = 0;

  // A text that the caller may keep here; nothing in the library reads it.
  /// Keeps a text.
  virtual void SetNote(const String& note) = 0;
  /// Makes the text empty.
  virtual void ClearNote() = 0;
  /// The text, which may be written.
  virtual String& GetNote() = 0;
};

using ClientPtr = Pointer<Client>;

/// The client of a PipeServerDispatch, in this process or in another.
class VEXG_EXPORT PipeClient : public Client {
 public:
  /// Seconds that each operation waits for a server. A private server that did not answer is tried
  /// once more by each later operation, without waiting: its name does not come back.
  static constexpr double kPatience = 30.0;

  /// @param name  of the dispatcher's pipe.
  explicit PipeClient(const String& name, double patience = kPatience);
  /// Disconnects.
  ~PipeClient() override;

  /// The dispatcher's name, "::", and the private pipe's name or "NULL".
  String GetName() const override;
  bool IsConnected() const override { return !serverPipe_.IsNull(); }
  bool Connect() override;
  void Disconnect() override;
  void Shutdown() override;
  bool Send(const String& request, String& reply) override;
  Map<String, JobResult> Submit(const String& jobDocument) override;
  void SetNote(const String& note) override { note_ = note; }
  void ClearNote() override { note_ = ""; }
  String& GetNote() override { return note_; }

  /// Changes how long each later operation waits for a server; 0 has it try once.
  void SetPatience(double seconds) { patience_ = seconds; }

 private:
  NamedPipe dispatchPipe_;
  NamedPipePtr serverPipe_;
  bool serverGone_ = false;  // the private server did not answer: nobody waits for it again
  double patience_;
  String note_;
};

}  // namespace lumo
