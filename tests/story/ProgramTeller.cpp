// SPDX-License-Identifier: Apache-2.0
#include "tests/story/ProgramTeller.h"

#include <fmt/format.h>

#include <chrono>
#include <csignal>
#include <thread>

#include "tests/story/Story.h"
#include "tests/support/MediaFixtures.h"

namespace quilt::story {

namespace {

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;

const std::map<std::string, std::string> kEnvironment{{"PATH", "/usr/bin:/bin"}, {"HOME", "/nonexistent"}};

std::string inWords(const std::vector<std::string>& arguments, const support::Ended& ended) {
  return fmt::format("quilt {} ends with {}: {}{}", fmt::join(arguments, " "), ended.exit, ended.out, ended.err);
}

}  // namespace

Outcome ProgramTeller::run(const std::vector<std::string>& arguments, std::string* printed) {
  std::vector<std::string> all{"--library", _library, "--progress", "none"};
  all.insert(all.end(), arguments.begin(), arguments.end());
  const auto start = Clock::now();
  support::RunningProgram program(all, kEnvironment, "");
  const auto stop = std::exchange(_stop, std::nullopt);
  double& seconds = _seconds[arguments[0]];
  if (stop) {
    std::this_thread::sleep_for(std::chrono::duration<double>(stop->moment * seconds));
    if (!program.hasEnded()) program.signal(stop->signal);
  }
  const support::Ended ended = program.wait();
  if (stop && (ended.exit == -stop->signal || (stop->signal == SIGINT && ended.exit == 130))) {
    Outcome stopped{.isDone = false, .wasStopped = true};
    if (ended.exit == 130 && !leftovers(_library).empty())
      stopped.complaint = "An interrupted command leaves files behind";
    return stopped;
  }
  seconds = std::chrono::duration<double>(Clock::now() - start).count();
  if (printed) *printed = ended.out;
  if (ended.exit == 0) return {};
  return {.isDone = false, .complaint = inWords(arguments, ended)};
}

Outcome ProgramTeller::runRefused(const std::vector<std::string>& arguments) {
  std::vector<std::string> all{"--library", _library};
  all.insert(all.end(), arguments.begin(), arguments.end());
  const support::Ended ended = support::RunningProgram(all, kEnvironment, "").wait();
  if (ended.exit > 0 && !ended.err.empty()) return {};
  return {.isDone = false, .complaint = inWords(arguments, ended) + ", and does not refuse"};
}

Outcome ProgramTeller::newDocument(const std::string& title, const Path& theme) {
  const Outcome made = run({"new", "document", title});
  if (!made.isDone) return made;
  return run({"set", title, "theme=" + theme.native()});
}

Outcome ProgramTeller::importFile(const Path& file) { return run({"import", file}); }

Outcome ProgramTeller::removeDocument(const Document& document) { return run({"remove", document.uuid, "--force"}); }

Outcome ProgramTeller::setTitle(const Document& document, const std::string& title) {
  return run({"set", document.uuid, "title=" + title});
}

Outcome ProgramTeller::setDescription(const Document& document, const std::string& description) {
  return run({"set", document.uuid, "description=" + description});
}

Outcome ProgramTeller::setPoster(const Document& document, const Path& picture) {
  return run({"set", document.uuid, "poster=" + picture.native()});
}

Outcome ProgramTeller::convert(const Document& document, const std::string& format) {
  return run({"convert", document.uuid, "--format", format});
}

Outcome ProgramTeller::finalize(const Document& document) { return run({"finalize", document.uuid}); }

Outcome ProgramTeller::exportTo(const Document& document, const Path& folder, bool zipped, Path& made) {
  std::vector<std::string> arguments{"export", document.uuid, folder};
  if (zipped) arguments.emplace_back("--zip");
  std::string printed;
  const Outcome outcome = run(arguments, &printed);
  if (outcome.isDone) made = printed.substr(0, printed.find('\n'));
  return outcome;
}

Outcome ProgramTeller::addItems(const Document& document, const std::vector<std::string>& sources) {
  std::vector<std::string> arguments{"add", document.uuid};
  arguments.insert(arguments.end(), sources.begin(), sources.end());
  return run(arguments);
}

Outcome ProgramTeller::addComposition(const Document& document, const std::string& category, const std::string& title,
                                      const std::vector<Path>& files) {
  std::vector<std::string> arguments{"add", document.uuid, "--title", title,
                                     category == "Montage" ? "--montage" : "--dual"};
  arguments.insert(arguments.end(), files.begin(), files.end());
  return run(arguments);
}

Outcome ProgramTeller::addExtra(const Document& document, const Item& item, const Path& file) {
  return run({"add", document.uuid, file, "--extra-of", item.uuid});
}

Outcome ProgramTeller::setCommentary(const Document& document, const Item& item, const Path& file) {
  return run({"add", document.uuid, file, "--commentary-of", item.uuid});
}

Outcome ProgramTeller::setItemTitle(const Document&, const Item& item, const std::string& title) {
  return run({"set", item.uuid, "title=" + title});
}

Outcome ProgramTeller::removeItem(const Document& document, const Item& item) {
  return run({"remove", item.uuid, "--from", document.uuid, "--force"});
}

Outcome ProgramTeller::moveItem(const Document& document, std::size_t from, std::size_t to) {
  return run({"move", document.uuid, document.items[from].uuid, "--to", std::to_string(to)});
}

Contents ProgramTeller::look() {
  Contents contents = readLibrary(_library);
  for (const Document& document : contents.documents) lookAtPictures(packageOf(document), document, contents.faults);
  for (const std::string& name : leftovers(_library)) contents.faults.push_back("Left behind: " + name);
  const Outcome checked = run({"check"});
  if (!checked.isDone) contents.faults.push_back(checked.complaint);
  return contents;
}

Path ProgramTeller::packageOf(const Document& document) const {
  for (const auto& collection : fs::directory_iterator(_library / "Collections"))
    for (const auto& package : fs::directory_iterator(collection.path()))
      if (package.path().extension() == ".qpk" && !package.path().filename().native().starts_with('.'))
        if (std::vector<std::string> faults; readPackage(package.path(), faults).uuid == document.uuid)
          return package.path();
  return {};
}

bool ProgramTeller::stopNext(Dice& dice) {
  const int signal = dice.isLucky(3) ? SIGINT : SIGKILL;
  _stop = {signal, static_cast<double>(dice.below(100)) / 100};
  return true;
}

/// Whoever was stopped looks what is there, writes to each document, and makes another.
void ProgramTeller::goOn(const std::vector<Contents*>& contents) {
  for (const Document& document : readLibrary(_library).documents) (void)run({"set", document.uuid, "author=Ann"});
  const std::string title = fmt::format("Afterwards {}", ++_stops);
  const Outcome made = newDocument(title, _theme);
  for (Contents* one : contents) {
    one->documents.push_back({title, "Interactive", {}, "", {}, _theme.filename()});
    if (!made.isDone) one->faults.push_back(made.complaint);
  }
}

std::vector<Operation> ProgramTeller::ownOperations() {
  return {
      {"the theme goes away for a while", 1, [this](Story& story) { return theThemeGoesAwayForAWhile(story); }},
      {"finalize beside notes of one's own", 1, [this](Story& story) { return finalizeBesideOwnNotes(story); }},
      {"add a damaged file", 1, [this](Story& story) { return addADamagedFile(story); }},
  };
}

bool ProgramTeller::theThemeGoesAwayForAWhile(Story& story) {
  Document* document = story.anyDocument([](const Document& one) { return !one.theme.empty(); });
  if (!document) return false;
  const Path away = story.theme().native() + ".away";
  document->description = "without its theme";
  story.step(document->title, [&] {
    fs::rename(story.theme(), away);
    const Outcome outcome = setDescription(*document, document->description);
    fs::rename(away, story.theme());
    return outcome;
  });
  return true;
}

bool ProgramTeller::finalizeBesideOwnNotes(Story& story) {
  Document* document = story.anyDocument([](const Document& one) { return !one.theme.empty() && !one.items.empty(); });
  if (!document) return false;
  dontStop();
  const Path notes = packageOf(*document) / "notes.txt";
  support::writeBytes(notes, "Mine");
  story.step(document->title, [&] { return runRefused({"finalize", document->uuid}); });
  if (!fs::exists(notes)) story.complain("The notes are gone");
  fs::remove(notes);
  return true;
}

bool ProgramTeller::addADamagedFile(Story& story) {
  Document* document = story.anyDocument();
  if (!document) return false;
  dontStop();
  const Material& material =
      story.anyMaterial([](const Material& one) { return one.category == "Document" || one.category == "Image"; });
  const Path file = story.outside(material);
  support::writeBytes(file, material.bytes.substr(0, 8));
  story.step(file.filename().native() + " to " + document->title, [&] {
    return runRefused({"add", document->uuid, file});
  });
  return true;
}

}  // namespace quilt::story
