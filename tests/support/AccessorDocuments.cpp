// SPDX-License-Identifier: Apache-2.0
#include "tests/support/AccessorDocuments.h"

#include <map>
#include <stdexcept>

#include "quilt/scripting/Accessor.h"

namespace quilt::support {

namespace {

using scripting::Accessor;
using scripting::Answer;
using scripting::Argument;
using scripting::ExposedClass;

// Of which class an answer is.
const std::string& classOfAnswer(std::string_view accessor) {
  static const std::map<std::string, std::string, std::less<>> classes{
      {"cvMediaAtIndex:", "QuiltMedia"},
      {"cvSourceAtIndex:", "QuiltMediaSource"},
      {"cvAudioCommentarySource", "QuiltMediaSource"},
      {"cvExtraAtIndex:", "QuiltMediaSource"},
      {"cvMainDerivative", "QuiltMediaDerivative"},
      {"cvDerivativeAtIndex:", "QuiltMediaDerivative"},
      {"cvPreviewAtIndex:", "QuiltMediaPreview"},
  };
  const auto found = classes.find(accessor);
  if (found == classes.end()) throw std::runtime_error("of which class is " + std::string(accessor) + "?");
  return found->second;
}

// "cvSetTitle" and its parameter.
std::string methodOf(const Accessor& accessor) {
  const std::string name(accessor.name.substr(0, accessor.name.find(':')));
  switch (accessor.argument) {
    case Argument::None:
      return name + "()";
    case Argument::Text:
      return name + "(text: string | null)";
    case Argument::Index:
      return name + "(index: number)";
  }
  return {};
}

std::string answerOf(const Accessor& accessor) {
  switch (accessor.answer) {
    case Answer::Nothing:
      return "null";
    case Answer::Text:
      return "string | null";
    case Answer::Number:
      return "number";
    case Answer::Texts:
      return "string[] | null";
    case Answer::Object:
      return classOfAnswer(accessor.name) + " | null";
  }
  return {};
}

std::string forTable(std::string text) {
  for (std::size_t place = 0; (place = text.find('|', place)) != std::string::npos; place += 2)
    text.insert(place, "\\");
  return text;
}

}  // namespace

std::string accessorsPage() {
  std::string page =
      "# Accessors\n\n"
      "What scripts can reach of the model: these methods of these six classes and nothing else. In JavaScript each\n"
      "answers a promise (see [bridge.md](bridge.md)); none is null. Every call writes one debug line to the log. "
      "What\n"
      "changes the model saves it, as the same change in the host does.\n\n"
      "This page is made from the table in `quilt/scripting/`; a test compares the two.\n";
  for (const ExposedClass& type : scripting::exposedClasses()) {
    page += "\n## " + std::string(type.name) + "\n\n| accessor | in JavaScript | answers | |\n|---|---|---|---|\n";
    for (const Accessor& accessor : type.accessors)
      page += "| `" + std::string(accessor.name) + "` | `" + forTable(methodOf(accessor)) + "` | `" +
              forTable(answerOf(accessor)) + "` | " + std::string(accessor.summary) + " |\n";
  }
  return page;
}

std::string accessorDeclarations() {
  std::string text;
  for (const ExposedClass& type : scripting::exposedClasses()) {
    text += "\nexport interface " + std::string(type.name) + " {\n  readonly className: '" + std::string(type.name) +
            "';\n";
    for (const Accessor& accessor : type.accessors)
      text += "  /** " + std::string(accessor.summary) + " */\n  " + methodOf(accessor) + ": Promise<" +
              answerOf(accessor) + ">;\n";
    text += "}\n";
  }
  return text;
}

}  // namespace quilt::support
