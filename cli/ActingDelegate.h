// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "cli/Catalogue.h"
#include "cli/Delegate.h"
#include "cli/LogCollector.h"
#include "cli/Output.h"
#include "cli/Progress.h"

namespace quilt::cli {

/// What every command works with.
struct Context {
  const Settings& settings;
  Messages& messages;
  Output& output;
  Progress& progress;
  LogCollector& log;
};

/// Does what is asked. Each command is in a file of its own.
class ActingDelegate : public Delegate {
 public:
  explicit ActingDelegate(const Context& context) : _context(context) {}

  void perform(const ImportRequest& request) override;
  void perform(const ListRequest& request) override;
  void perform(const ShowRequest& request) override;
  void perform(const InfoRequest& request) override;
  void perform(const NewCollectionRequest& request) override;
  void perform(const NewDocumentRequest& request) override;
  void perform(const SetRequest& request) override;
  void perform(const AddRequest& request) override;
  void perform(const MoveRequest& request) override;
  void perform(const ConvertRequest& request) override;
  void perform(const RemoveRequest& request) override;
  void perform(const ExportRequest& request) override;
  void perform(const FinalizeRequest& request) override;
  void perform(const BuildRequest& request) override;
  void perform(const ThemesRequest& request) override;
  void perform(const CheckRequest& request) override;
  void perform(const ServeRequest& request) override;
  void perform(const DoctorRequest& request) override;
  void perform(const HelpRequest& request) override;
  void perform(const VersionRequest& request) override;

 protected:
  [[nodiscard]] Path library() const { return libraryPath(_context.settings.library); }

  Context _context;
};

/// Checks what is asked as the other does, prints what would be done, and changes nothing. Commands that only read do
/// their work.
class PreviewDelegate final : public ActingDelegate {
 public:
  using ActingDelegate::ActingDelegate;
  using ActingDelegate::perform;

  void perform(const ImportRequest& request) override;
  void perform(const NewCollectionRequest& request) override;
  void perform(const NewDocumentRequest& request) override;
  void perform(const SetRequest& request) override;
  void perform(const AddRequest& request) override;
  void perform(const MoveRequest& request) override;
  void perform(const ConvertRequest& request) override;
  void perform(const RemoveRequest& request) override;
  void perform(const ExportRequest& request) override;
  void perform(const FinalizeRequest& request) override;
  void perform(const BuildRequest& request) override;
  void perform(const ServeRequest& request) override;

 private:
  void plan(Json step, const std::string& line);
};

}  // namespace quilt::cli
