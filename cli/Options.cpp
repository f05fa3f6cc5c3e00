// SPDX-License-Identifier: Apache-2.0
#include "cli/Options.h"

#include <algorithm>

#include "cli/Failure.h"
#include "cli/Text.h"

namespace quilt::cli {

namespace {

[[noreturn]] void refuse(std::string message) { throw Failure(ExitCode::Usage, std::move(message)); }

Command importRequest(const Arguments& arguments) {
  ImportRequest request;
  request.nulSeparated = arguments.has("-0");
  request.filesFromInput = request.nulSeparated;
  for (std::string& file : arguments.all("FILE")) {
    if (file == "-") {
      request.filesFromInput = true;
    } else {
      request.files.push_back(std::move(file));
    }
  }
  if (request.files.empty() && !request.filesFromInput) refuse("FILE is missing: name the files to import");
  request.collection = arguments.first("--collection");
  return request;
}

Command listRequest(const Arguments& arguments) { return ListRequest{arguments.first("COLLECTION")}; }

Command showRequest(const Arguments& arguments) { return ShowRequest{*arguments.first("OBJECT")}; }

Command infoRequest(const Arguments& arguments) { return InfoRequest{arguments.all("FILE")}; }

Command newRequest(const Arguments& arguments) {
  const std::string title = *arguments.first("TITLE");
  if (title.empty()) refuse("TITLE is empty");
  if (!isText(title)) refuse("TITLE is not UTF-8, or has control characters");
  if (arguments.first("KIND") == "document")
    return NewDocumentRequest{title, arguments.first("--collection"),
                              arguments.first("--type").value_or("Interactive")};
  for (const char* option : {"--collection", "--type"})
    if (arguments.has(option)) refuse(std::string(option) + " goes with \"new document\" only");
  return NewCollectionRequest{title};
}

Command setRequest(const Arguments& arguments) {
  SetRequest request{*arguments.first("OBJECT"), {}};
  for (const std::string& assignment : arguments.all("KEY=VALUE")) {
    const std::size_t equals = assignment.find('=');
    if (equals == std::string::npos || equals == 0) refuse(inQuotes(assignment) + " is not of the form KEY=VALUE");
    const std::string key = assignment.substr(0, equals);
    for (const auto& [earlier, value] : request.values)
      if (earlier == key) refuse(inQuotes(key) + " is given twice");
    const std::string value = assignment.substr(equals + 1);
    // Any bytes can be a file's name.
    if (key != "poster" && key != "theme" && !isText(value))
      refuse("The value of " + inQuotes(key) + " is not UTF-8, or has control characters");
    request.values.emplace_back(key, value);
  }
  return request;
}

Command removeRequest(const Arguments& arguments) {
  RemoveRequest request{arguments.all("OBJECT"), arguments.first("--from"), arguments.has("--force")};
  if (!request.from && request.objects.size() > 1)
    refuse("Remove one document or collection at a time; items take --from DOCUMENT");
  return request;
}

Command exportRequest(const Arguments& arguments) {
  ExportRequest request{
      *arguments.first("DOCUMENT"), *arguments.first("DIR"), arguments.has("--zip"), {}, arguments.first("--theme")};
  for (std::string& format : arguments.all("--format"))
    if (std::find(request.formats.begin(), request.formats.end(), format) == request.formats.end())
      request.formats.push_back(std::move(format));
  if (request.formats.empty()) request.formats.emplace_back("Desktop");
  return request;
}

Command doctorRequest(const Arguments&) { return DoctorRequest{}; }

Command helpRequest(const Arguments& arguments) {
  HelpRequest request{arguments.first("COMMAND"), arguments.first("--as").value_or("text")};
  if (request.command && request.as != "text" && request.as != "man")
    refuse("Completions are for all commands together; leave COMMAND out");
  return request;
}

constexpr std::string_view kObject =
    "A DOCUMENT or COLLECTION is named by its UUID, by the beginning of it, by its title or by its path;\n"
    "an ITEM of a document by its UUID or the beginning of it.\n";

}  // namespace

std::vector<std::string> Arguments::all(std::string_view name) const {
  const auto found = _values.find(std::string(name));
  return found == _values.end() ? std::vector<std::string>() : found->second;
}

std::optional<std::string> Arguments::first(std::string_view name) const {
  const auto found = _values.find(std::string(name));
  if (found == _values.end()) return std::nullopt;
  return found->second.front();
}

const std::vector<Option>& commonOptions() {
  static const std::vector<Option> options{
      {"--library", "", "DIR",
       "the library (else $QUILT_LIBRARY, else $XDG_DATA_HOME/quilt/Library); made on first use"},
      {"--json", "", "", "print exactly one JSON document"},
      {"--progress", "", "STYLE", "auto, json (one event a line on stderr) or none", false, {"auto", "json", "none"}},
      {"--quiet", "-q", "", "print results and errors only"},
      {"--verbose", "-v", "", "print what the library logs"},
      {"--no-color", "", "", "print without colours (also: NO_COLOR)"},
      {"--help", "-h", "", "explain the program, or the command"},
      {"--version", "", "", "print the version"},
  };
  return options;
}

const std::vector<CommandDescription>& commands() {
  static const std::vector<CommandDescription> table{
      {"import",
       "make a document of each file",
       "Each file is copied into a new document of the collection \"Imports\", which is made when it is\n"
       "missing, or of the collection named. Prints a line a document: UUID, type, title. A file that\n"
       "cannot be imported is reported, and the rest is done.\n",
       {{"FILE", "a movie, an audio file, a PDF or an EPUB; \"-\": files listed on the standard input", false, true}},
       {{"--collection", "", "C", "the collection to import into"},
        {"-0", "", "", "the standard input lists files, each ended by a NUL byte"}},
       true,
       importRequest},
      {"list",
       "print the collections with their documents",
       "",
       {{"COLLECTION", "print this one alone", false}},
       {},
       false,
       listRequest},
      {"show",
       "print a document or collection with everything in it",
       kObject,
       {{"OBJECT", "a document or a collection"}},
       {},
       false,
       showRequest},
      {"info",
       "print what the library sees in a file",
       "Type identifier, MIME type, category, formats that it suits, codecs, size, duration, chapters and\n"
       "metadata. A file that cannot be used is reported with the reason.\n",
       {{"FILE", "any file", true, true}},
       {},
       false,
       infoRequest},
      {"new",
       "make an empty collection or document",
       "Prints its UUID. A document goes into the collection named, else into \"Imports\", which is made when\n"
       "it is missing.\n",
       {{"KIND", "collection or document", true, false, {"collection", "document"}}, {"TITLE", "its title"}},
       {{"--collection", "", "C", "the collection of the document"},
        {"--type",
         "",
         "T",
         "the type of the document: Interactive (the default), PDF, EPUB or Static",
         false,
         {"Interactive", "PDF", "EPUB", "Static"}}},
       true,
       newRequest},
      {"set",
       "change what describes a document, a collection or an item",
       "KEY is one of\n"
       "  of a document    title description author keywords category advisoryLabel jukeboxOrder theme poster\n"
       "  of a collection  title description author copyright keywords category advisoryLabel theme poster\n"
       "  of an item       title description\n"
       "A theme is an identifier or the path of a bundle, a poster the path of an image. An empty VALUE\n"
       "clears. Nothing is changed unless everything can be.\n",
       {{"OBJECT", "a document, a collection or an item"}, {"KEY=VALUE", "what to set", true, true}},
       {},
       true,
       setRequest},
      {"remove",
       "remove a document or collection, or items of a document, with the files",
       "Asks on a terminal; elsewhere --force is needed.\n",
       {{"OBJECT", "a document or a collection; with --from, items of it", true, true}},
       {{"--from", "", "DOCUMENT", "the document that holds the items"}, {"--force", "", "", "do not ask"}},
       true,
       removeRequest},
      {"export",
       "build the finished package of a document",
       "Copies, converts and finalizes what is needed, and writes a package (or its archive) of the\n"
       "document's title into DIR. Prints its path.\n",
       {{"DOCUMENT", "the document"}, {"DIR", "the folder to write into; made when it is missing"}},
       {{"--zip", "", "", "write a zip archive"},
        {"--format", "", "FORMAT", "Desktop (the default), 720p or 480p", true, {"Desktop", "720p", "480p"}},
        {"--theme", "", "THEME", "set the document's theme first: an identifier or the path of a bundle"}},
       true,
       exportRequest},
      {"doctor", "print which decoders, encoders, renderers and themes are there", "", {}, {}, false, doctorRequest},
      {"help",
       "explain the program, or a command",
       "",
       {{"COMMAND", "the command", false}},
       {{"--as",
         "",
         "FORM",
         "text, man (a manual page), or completions for bash, zsh or fish",
         false,
         {"text", "man", "bash", "zsh", "fish"}}},
       false,
       helpRequest},
  };
  return table;
}

const CommandDescription* findCommand(std::string_view name) {
  for (const CommandDescription& command : commands())
    if (command.name == name) return &command;
  return nullptr;
}

std::vector<Option> optionsOf(const CommandDescription& command) {
  std::vector<Option> options = command.options;
  if (command.writes) options.push_back({"--dry-run", "", "", "print what would be done, and change nothing"});
  return options;
}

std::string usageOf(const Option& option) {
  std::string usage(option.name);
  if (!option.value.empty()) (usage += ' ') += option.value;
  return usage;
}

std::string usageOf(const CommandDescription& command) {
  std::string usage = "quilt ";
  usage += command.name;
  for (const Positional& positional : command.positionals) {
    const std::string name = std::string(positional.name) + (positional.repeats ? "..." : "");
    usage += positional.required ? " " + name : " [" + name + "]";
  }
  for (const Option& option : optionsOf(command)) usage += " [" + usageOf(option) + "]" + (option.repeats ? "..." : "");
  return usage;
}

}  // namespace quilt::cli
