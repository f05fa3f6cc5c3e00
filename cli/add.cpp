// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>

#include "cli/ActingDelegate.h"
#include "cli/EntryJson.h"
#include "cli/Interrupt.h"
#include "cli/Items.h"
#include "cli/LibrarySession.h"
#include "cli/Saving.h"
#include "cli/Text.h"
#include "quilt/media/QuiltMediaExtra.h"
#include "quilt/platform/base/Worker.h"

namespace quilt::cli {

namespace {

constexpr const char* kNotAdded = "files could not be added";
constexpr const char* kStopped = "Nothing of the rest was added";

using Kind = AddRequest::Kind;

/// What to add where, looked at before anything is changed.
struct AdditionPlan {
  std::vector<NewItem> items;         // of Kind::Items, Montage and DualSource
  std::vector<NewSource> companions;  // of Kind::Extras and Commentary
  std::vector<Failure> failures;
};

/// The document, and the item that extras or a commentary go with.
struct Target {
  FoundDocument document;
  const ItemEntry* item = nullptr;
};

Target findTarget(const Catalogue& catalogue, const AddRequest& request) {
  Target target{findDocument(catalogue, request.document), nullptr};
  if (request.item) target.item = &findItem(*target.document.document, *request.item);
  return target;
}

std::vector<NewSource> lookAtAll(const AddRequest& request, std::vector<Failure>& failures) {
  std::vector<NewSource> sources;
  for (std::size_t i = 0; i < request.sources.size(); ++i) {
    if (Interrupt::isRequested()) throw Interrupt::failure("Nothing was added");
    try {
      NewSource source = lookAt(request.sources[i]);
      if (i < request.timecodes.size()) source.timecode = request.timecodes[i];
      sources.push_back(std::move(source));
    } catch (const Failure& failure) {
      failures.push_back(failure);
    }
  }
  return sources;
}

/// One item of all sources.
NewItem composed(const AddRequest& request, std::vector<NewSource> sources) {
  NewItem item;
  item.title = request.title.value_or(sources.front().title);
  item.category =
      request.kind == Kind::Montage ? kQuiltMediaContentCategoryMontage : kQuiltMediaContentCategoryDualSource;
  item.sources = std::move(sources);
  checkSources(item);
  return item;
}

AdditionPlan look(const AddRequest& request) {
  AdditionPlan plan;
  std::vector<NewSource> sources = lookAtAll(request, plan.failures);
  const bool isOneItem = request.kind == Kind::Montage || request.kind == Kind::DualSource;
  // What belongs together is added together or not at all.
  if (sources.empty() || (isOneItem && !plan.failures.empty())) {
    throwIfAny(plan.failures, 0, kNotAdded);
    return plan;
  }
  if (request.kind == Kind::Extras || request.kind == Kind::Commentary) {
    if (request.kind == Kind::Commentary) checkCommentary(sources.front());
    plan.companions = std::move(sources);
    if (request.title) plan.companions.front().title = *request.title;
    return plan;
  }
  if (isOneItem) {
    plan.items.push_back(composed(request, std::move(sources)));
  } else {
    for (NewSource& source : sources) {
      NewItem item;
      item.title = request.title.value_or(source.title);
      item.sources.push_back(std::move(source));
      plan.items.push_back(std::move(item));
    }
  }
  if (request.commentary) {
    const NewSource commentary = lookAt(*request.commentary);
    checkCommentary(commentary);
    for (NewItem& item : plan.items) item.commentary = commentary;
  }
  return plan;
}

/// Adds one thing after the other, and tells how far the whole is.
class Addition {
 public:
  Addition(const Context& context, double total) : _context(context), _total(total) {}

  /// `add` gets the block that maps its percentages; it answers whether it was done.
  void step(const std::string& title, double weight, const Path& target,
            const std::function<bool(const ProgressionBlock&)>& add) {
    if (Interrupt::isRequested()) return;
    _context.log.beginOperation();
    const std::string stage = "Adding " + title;
    const bool added = add([&](double percentage) {
      _context.progress.report(stage, (_before + weight * percentage / 100) * 100 / _total);
      return !Interrupt::isRequested();
    });
    _before += weight;
    if (added) {
      ++_done;
      if (!_context.settings.quiet) _context.log.showWarnings();
    } else if (!Interrupt::isRequested()) {
      failures.push_back(explain("Cannot add " + inQuotes(title), _context.log, target, target));
    }
  }

  [[nodiscard]] std::size_t done() const { return _done; }

  std::vector<Failure> failures;

 private:
  const Context& _context;
  const double _total;
  double _before = 0;
  std::size_t _done = 0;
};

void print(Output& output, const QuiltMedia& item) {
  output.item(toJson(item), item.uuid() + '\t' + escaped(item.contentCategory().value_or("")) + '\t' +
                                escaped(item.title().value_or("")));
}

void print(Output& output, const QuiltMediaSource& source) { output.item(toJson(source), source.uuid()); }

void addItems(const AdditionPlan& plan, QuiltDocument& document, Addition& addition, Output& output) {
  for (const NewItem& item : plan.items)
    addition.step(item.title, weightOf(item), document.path(), [&](const ProgressionBlock& block) {
      const auto added = addItem(document, item, block);
      if (added) print(output, *added);
      return added != nullptr;
    });
}

void addCompanions(const AdditionPlan& plan, Kind kind, QuiltDocument& document, QuiltMedia& item, Addition& addition,
                   Output& output) {
  for (const NewSource& companion : plan.companions)
    addition.step(companion.title, weightOf(companion), document.path(), [&](const ProgressionBlock& block) {
      std::shared_ptr<QuiltMediaSource> added;
      if (kind == Kind::Extras) {
        added = addExtra(document, item, companion, block);
      } else {
        added = setCommentary(document, item, companion, block);
      }
      if (added) print(output, *added);
      return added != nullptr;
    });
}

}  // namespace

void ActingDelegate::perform(const AddRequest& request) {
  _context.output.beginList();
  LibrarySession session(library(), _context);
  (void)findTarget(session.catalogue(), request);
  AdditionPlan plan = look(request);
  session.lock(findTarget(session.catalogue(), request).document);
  const Target target = findTarget(session.catalogue(), request);
  const auto document = session.open(target.document);
  const auto item = target.item ? document->mediaWithUUID(target.item->uuid) : nullptr;
  if (target.item && !item)
    throw Failure(ExitCode::Invalid, "The item " + inQuotes(*request.item) + " cannot be opened", document->path());

  double total = 0;
  for (const NewItem& one : plan.items) total += weightOf(one);
  for (const NewSource& one : plan.companions) total += weightOf(one);
  Addition addition(_context, total);
  platform::runOnWorker([&] {
    if (item) {
      addCompanions(plan, request.kind, *document, *item, addition, _context.output);
    } else {
      addItems(plan, *document, addition, _context.output);
    }
  });
  const std::size_t count = plan.items.size() + plan.companions.size();
  if (addition.done() + addition.failures.size() < count) throw Interrupt::failure(kStopped);
  plan.failures.insert(plan.failures.end(), addition.failures.begin(), addition.failures.end());
  throwIfAny(plan.failures, addition.done(), kNotAdded);
}

void PreviewDelegate::perform(const AddRequest& request) {
  _context.output.beginList();
  const Catalogue catalogue = readCatalogue(library());
  const Target target = findTarget(catalogue, request);
  const AdditionPlan plan = look(request);
  const DocumentEntry& document = *target.document.document;
  const std::string where = "the document " + inQuotes(document.title, document.uuid);
  for (const NewItem& item : plan.items) {
    const std::string category = item.category.value_or(item.sources.front().category);
    Json sources = Json::array();
    for (const NewSource& source : item.sources) sources.push_back(source.url.absoluteString());
    PreviewDelegate::plan(
        {{"action", "add"}, {"title", item.title}, {"category", category}, {"sources", sources}, {"to", document.uuid}},
        fmt::format("Would add the {} item {} to {}", category, inQuotes(item.title), where));
  }
  const bool areExtras = request.kind == Kind::Extras;
  const ItemEntry owner = target.item ? *target.item : ItemEntry();
  for (const NewSource& companion : plan.companions)
    PreviewDelegate::plan(
        {{"action", areExtras ? "add-extra" : "set-commentary"},
         {"title", companion.title},
         {"source", companion.url.absoluteString()},
         {"to", owner.uuid}},
        fmt::format("Would {} {} {} the item {}", areExtras ? "add" : "make", inQuotes(companion.title),
                    areExtras ? "as an extra to" : "the audio commentary of", inQuotes(owner.title, owner.uuid)));
  throwIfAny(plan.failures, plan.items.size() + plan.companions.size(), kNotAdded);
}

}  // namespace quilt::cli
