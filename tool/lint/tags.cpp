#include "tool/lint/tags.h"

namespace tool::lint {
namespace {

constexpr Severity kError = Severity::kError;
constexpr Severity kWarning = Severity::kWarning;
constexpr Severity kNote = Severity::kNote;

// The descriptor itself.
const std::vector<Tag> kDescriptorTags = {
    {"json-syntax", kError, false, "The file is not JSON.",
     "The library reads strict JSON: no comments, no comma after the last element,\n"
     "no member named twice, texts in double quotes, nothing behind the value. A\n"
     "descriptor that does not parse is logged (\"Malformed index.conf\") and gives\n"
     "nothing to be found. Correct the place that the finding names; what follows\n"
     "it has not been looked at."},
    {"not-utf8", kError, false, "The file holds bytes that are not UTF-8.",
     "Each such byte becomes the replacement character in the search document, so\n"
     "neither the text nor a search for it looks right. Save the file as UTF-8."},
    {"wrong-type", kError, true, "A value has the wrong type.",
     "The library does not convert values into what was meant: it leaves the part\n"
     "out, takes a default, or fails for the whole package. The message says which\n"
     "type is wanted."},
    {"missing-member", kError, true, "A member that must be there is missing.",
     "An entry needs \"app\" and \"title\", a module \"title\", a keyword object \"text\".\n"
     "Without \"app\" the library refuses to write the entry and the package fails\n"
     "as a whole; without \"title\" a hit has no name; a keyword without \"text\" is\n"
     "left out."},
    {"params-missing", kError, true, "A module has no \"params\".",
     "\"params\" tells the modules of an application apart and tells the application\n"
     "what to open. Without it the module's id is that of the application with a\n"
     "\"?\" behind it, and two such modules replace each other. Give each module a\n"
     "\"params\" of its own."},
    {"empty-member", kError, true, "A text that must say something is empty.",
     "An empty \"app\", \"params\", \"title\", \"stringset\" or keyword is taken as it is:\n"
     "an id, a name or a word of no letters. Fill it, or remove the member or\n"
     "keyword."},
    {"no-entries", kError, true, "The descriptor lists no entry.",
     "The root is a list without elements, so there is nothing to be found. Add an\n"
     "entry, or remove the file."},
    {"unknown-member", kWarning, true, "A member that means nothing.",
     "The library ignores members that it does not know, so a misspelt name fails\n"
     "silently. Correct the name or remove the member. Modules take \"app\" and\n"
     "\"stringset\" from their entry and cannot set them."},
    {"weight-range", kWarning, true, "A weight that has no effect.",
     "A weight says how often a keyword counts, from 1 to 5. Below 1 the keyword\n"
     "is left out; above 5 it counts as 5. A number of more than 31 bits, below 0 or\n"
     "above, is taken for none at all: the keyword counts once."},
    {"description-missing", kWarning, false, "An item has no description.",
     "A hit shows the title and below it the description, which is searched too.\n"
     "Without \"desc\" the line stays empty. Describe the item in a sentence."},
    {"duplicate-id", kError, false, "Two items have the same id.",
     "An entry's id is its \"app\"; a module's is the \"app\", a \"?\" and its \"params\".\n"
     "The index holds one document for an id: the item that is written last\n"
     "replaces the other. Items that no device shows together, because of their\n"
     "filters, may share an id. Ids are compared among all descriptors of one run."},
    {"nul-character", kError, false, "A text holds the character NUL.",
     "The search daemon refuses a document with such a text (code 603). Adding the\n"
     "package then fails as a whole, and keeps all requests waiting that are queued\n"
     "with it. Remove the character: a descriptor writes it \\u0000; in a file of\n"
     "texts it stands as a byte."},
    {"text-too-long", kError, false, "A text is longer than the index takes.",
     "An id has at most 4096 bytes, any other text of a document 1 MiB, and all of\n"
     "them fit into a message of 16 MiB. Keywords count in the language and in\n"
     "English, as often as their weights say, with the English title before them.\n"
     "A byte that is not UTF-8 counts as three. The search daemon refuses what is\n"
     "longer. Adding the package then fails as a whole, and keeps all requests\n"
     "waiting that are queued with it. Shorten the text."},
    {"keyword-repeats-title", kWarning, false, "A keyword is the same as the title.",
     "The title is searched anyway, and the English title is put among the\n"
     "keywords of every language. The keyword adds nothing: remove it, or use a\n"
     "word that people may type instead of the title."},
};

const std::vector<Tag> kFilterTags = {
    {"filter-never-passes", kError, false, "No device passes the filters.",
     "\"enable\" lets through the devices whose model or platform it lists,\n"
     "\"disable\" all but those it lists; the filters of an entry hold for its\n"
     "modules too. Here nothing is left: \"enable\" lists nothing, or \"disable\"\n"
     "lists all the same. With --known, the names in that file count as all the\n"
     "devices that there are."},
    {"model-unknown", kWarning, false, "A filter names a model that does not exist.",
     "The name is not among the \"models\" of the file given with --known. Names are\n"
     "compared exactly, upper and lower case and underscores included. Correct the\n"
     "name, or add it to the file."},
    {"platform-unknown", kWarning, false, "A filter names a platform that does not exist.",
     "The name is not among the \"platforms\" of the file given with --known. Names\n"
     "are compared exactly, upper and lower case included. Correct the name, or\n"
     "add it to the file."},
};

const std::vector<Tag> kTextTags = {
    {"reference-unresolved", kError, false, "A reference has no text in any language.",
     "A text with a colon is a reference: what stands before the first colon is a\n"
     "section, the rest is a key in it. No language has such a text, so the\n"
     "reference itself, or nothing, is shown and searched. Correct the name, or\n"
     "add the text; a literal text must not have a colon."},
    {"english-missing", kError, false, "There is no English text.",
     "English stands in for every language that has no texts at all, and every\n"
     "keyword is searched in English too. Add the text to the directory \"enu\"."},
    {"section-missing", kWarning, false, "A language lacks a section that is used.",
     "The language has texts of its own, so English does not stand in: the\n"
     "reference itself, such as \"app:title\", is shown and searched. Add the\n"
     "section, or remove all texts of the language."},
    {"section-uneven", kNote, false, "A language lacks a section that others have.",
     "The descriptor does not refer to the section, so nothing is lost in the\n"
     "search. It may be a part that is not translated yet."},
    {"text-missing", kWarning, false, "A language lacks a text.",
     "The language has the section, but not the key: nothing is shown and\n"
     "searched, and English does not stand in. Add the text."},
    {"text-empty", kWarning, false, "A text is empty.",
     "The key is there with an empty text: nothing is shown and searched, and\n"
     "English does not stand in. Translate the text."},
    {"text-untranslated", kWarning, false, "A text was left in English.",
     "The text of another language is word for word the English one. Only texts\n"
     "with at least three ordinary words are compared, since names and terms are\n"
     "often the same. Translate it."},
    {"language-absent", kNote, false, "A language has no texts.",
     "The English texts are shown and searched in this language. That is right for\n"
     "a package that is not translated into it."},
    {"language-unknown", kWarning, false, "A directory of texts is for no language.",
     "Below the texts root only the directories of the 21 language codes are read.\n"
     "Correct the name, such as \"ger\" and not \"deu\", or move what else it is to\n"
     "another place."},
    {"texts-unread", kWarning, false, "A file of texts gives none.",
     "It is longer than 1 MiB, is no regular file, may not be read, or has no line\n"
     "key=\"text\" below a line [section]. The language counts as one without texts.\n"
     "Make the file shorter, or correct it."},
    {"texts-not-found", kError, false, "The package's texts are not found.",
     "References are looked up in the directory that \"stringset\" names beside the\n"
     "descriptor, or else in the first directory \"texts\" in the package or up to\n"
     "six levels below. Without one, the web interface's own texts serve, where\n"
     "the references mean nothing or something else."},
    {"texts-ambiguous", kWarning, false, "The package has several directories of texts.",
     "The library takes the first directory \"texts\" that it meets, in the order in\n"
     "which the file system lists names, which differs from device to device. Keep\n"
     "one, rename the others, or name one beside the descriptor with \"stringset\"."},
    {"texts-beyond-reach", kError, false, "The directory of texts lies too deep.",
     "The library looks for \"texts\" in the package directory and up to six levels\n"
     "below it. Move the directory up, or name one beside the descriptor with\n"
     "\"stringset\"."},
};

const std::vector<Tag> kPackageTags = {
    {"descriptor-missing", kError, false, "The package has no descriptor.",
     "There is no file named exactly index.conf in the package directory or up to\n"
     "five levels below it, so the search finds nothing of the package."},
    {"descriptor-second", kError, false, "The package has more than one descriptor.",
     "A full rebuild reads one descriptor of a package: the first that it meets,\n"
     "in the order in which the file system lists names. Put all entries into one\n"
     "descriptor, as a list."},
    {"descriptor-beyond-reach", kError, false, "The descriptor lies too deep.",
     "A full rebuild looks for index.conf in the package directory and up to five\n"
     "levels below it. Move the file up."},
    {"descriptor-name", kError, false, "The file is not named index.conf.",
     "The library ignores a path whose last part is not exactly index.conf, in\n"
     "lower case. Rename the file."},
    {"descriptor-unreadable", kError, false, "The descriptor cannot be read.",
     "It is not a regular file, is longer than 16 MiB, or its permissions or the disk\n"
     "forbid it. The library takes it for one that is not JSON: it is logged and\n"
     "gives nothing to be found. Nothing else is known of it here."},
    {"package-docuvault", kError, false, "The package has a name that is left out.",
     "A full rebuild leaves out the directory named Docuvault. Its items are found\n"
     "after they were added, and gone after the next rebuild. Name the package\n"
     "otherwise."},
    {"package-unknown", kNote, false, "Where the package begins was guessed.",
     "The path is a descriptor outside the places where packages are installed.\n"
     "Its nearest directory that holds \"texts\" was taken for the package, or else\n"
     "its own. Name the package's directory instead, or say it with --package."},
};

std::vector<Tag> Joined() {
  std::vector<Tag> all;
  for (const auto* group : {&kDescriptorTags, &kFilterTags, &kTextTags, &kPackageTags}) {
    all.insert(all.end(), group->begin(), group->end());
  }
  return all;
}

}  // namespace

const std::vector<Tag>& AllTags() {
  static const std::vector<Tag> all = Joined();
  return all;
}

const Tag* FindTag(const std::string& name) {
  for (const Tag& tag : AllTags()) {
    if (name == tag.name) return &tag;
  }
  return nullptr;
}

const char* SeverityName(Severity severity) {
  switch (severity) {
    case Severity::kError:
      return "error";
    case Severity::kWarning:
      return "warning";
    case Severity::kNote:
      return "note";
  }
  return "error";
}

}  // namespace tool::lint
