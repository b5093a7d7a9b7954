#include "bvmake/DocBookElements.h"

#include <unordered_map>

namespace bvmake {

namespace {

using Table = std::unordered_map<std::string_view, DocBookElement>;

const Table& elementTable() {
  using enum DocBookElement;
  static const Table table = {
      {"set", division},
      {"book", division},
      {"part", division},
      {"partintro", block},
      {"reference", division},
      {"article", division},
      {"chapter", division},
      {"appendix", division},
      {"preface", division},
      {"glossary", division},
      {"bibliography", division},
      {"dedication", division},
      {"colophon", division},
      {"acknowledgements", division},
      {"topic", division},
      {"refentry", division},
      {"sect1", section},
      {"section", section},
      {"sect2", subsection},
      {"sect3", subsection},
      {"sect4", subsection},
      {"sect5", subsection},
      {"simplesect", subsection},
      {"refsect1", subsection},
      {"refsect2", subsection},
      {"refsect3", subsection},
      {"refsection", subsection},
      {"glossdiv", subsection},
      {"bibliodiv", subsection},
      {"qandadiv", subsection},

      {"info", info},
      {"title", title},
      {"subtitle", heading},
      {"bridgehead", heading},
      {"titleabbrev", skipped},
      {"abstract", abstract},
      {"keyword", keyword},
      {"subjectterm", keyword},
      {"indexterm", indexTerm},
      {"refname", referenceName},
      {"refpurpose", referencePurpose},
      {"refclass", block},
      {"menuchoice", menuChoice},
      {"keycombo", keyCombination},

      {"para", prose},
      {"simpara", prose},
      {"formalpara", block},
      {"itemizedlist", block},
      {"orderedlist", block},
      {"simplelist", block},
      {"variablelist", block},
      {"segmentedlist", block},
      {"calloutlist", block},
      {"glosslist", block},
      {"listitem", block},
      {"member", block},
      {"term", block},
      {"varlistentry", block},
      {"seglistitem", block},
      {"seg", block},
      {"segtitle", block},
      {"callout", block},
      {"procedure", block},
      {"step", block},
      {"substeps", block},
      {"stepalternatives", block},
      {"task", block},
      {"note", block},
      {"tip", block},
      {"warning", block},
      {"caution", block},
      {"important", block},
      {"sidebar", block},
      {"blockquote", block},
      {"epigraph", block},
      {"attribution", block},
      {"example", block},
      {"informalexample", block},
      {"figure", block},
      {"informalfigure", block},
      {"equation", block},
      {"informalequation", block},
      {"footnote", block},
      {"address", block},
      {"qandaset", block},
      {"qandaentry", block},
      {"question", block},
      {"answer", block},
      {"glossentry", block},
      {"glossdef", block},
      {"glosssee", block},
      {"glossseealso", block},
      {"bibliomixed", block},
      {"biblioentry", block},
      {"msgset", block},
      {"msgentry", block},
      {"refnamediv", block},
      {"refsynopsisdiv", block},
      {"refdescriptor", block},
      {"caption", block},

      {"table", notProse},
      {"informaltable", notProse},
      {"row", notProse},
      {"tr", notProse},
      {"entry", notProse},
      {"td", notProse},
      {"th", notProse},
      {"screen", notProse},
      {"programlisting", notProse},
      {"literallayout", notProse},
      {"synopsis", notProse},
      {"cmdsynopsis", notProse},
      {"funcsynopsis", notProse},
      {"classsynopsis", notProse},

      {"remark", skipped},
      {"comment", skipped},
      {"screenshot", skipped},
      {"mediaobject", skipped},
      {"inlinemediaobject", skipped},
      {"graphic", skipped},
      {"inlinegraphic", skipped},
      {"alt", skipped},
      {"toc", skipped},
      {"lot", skipped},
      {"index", skipped},
      {"setindex", skipped},
      {"beginpage", skipped},
      {"areaspec", skipped},
      {"legalnotice", skipped},
      {"refmeta", skipped},
  };
  return table;
}

}  // namespace

DocBookElement docBookElement(std::string_view name) {
  const auto found = elementTable().find(name);
  if (found != elementTable().end()) {
    return found->second;
  }
  // "bookinfo", "chapterinfo", "sect1info" … of the fourth version.
  const bool isInfo = name.ends_with("info") && name != "systeminfo" && name != "screeninfo" &&
                      name != "orderedinfo" && name != "refmiscinfo";
  return isInfo ? DocBookElement::info : DocBookElement::inlined;
}

bool isDocBookRoot(std::string_view name) {
  const DocBookElement element = docBookElement(name);
  return element == DocBookElement::division || element == DocBookElement::section;
}

}  // namespace bvmake
