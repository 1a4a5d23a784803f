// What a plug-in's file says about its loading, which the host reads without running any of its code.
#pragma once

// Put this line once at the top level of a plug-in's source, outside every namespace, if quazor shall load the plug-in
// only when `--plugin` names it, although it stands in one of the folders whose plug-ins are loaded by default. It adds
// an ELF note to the file; a note survives `strip`.
#define QUAZOR_LOADED_ONLY_WHEN_NAMED                  \
  __asm__(                                             \
      ".pushsection .note.quazor, \"a\", %note\n"      \
      ".balign 4\n"                                    \
      ".long 7\n" /* the length of the owner's name */ \
      ".long 0\n" /* the note's content is its type */ \
      ".long 1\n" /* kNoteLoadedOnlyWhenNamed */       \
      ".asciz \"Quazor\"\n"                            \
      ".balign 4\n"                                    \
      ".popsection")

namespace quazor {

inline constexpr char kNoteOwner[] = "Quazor";
inline constexpr unsigned kNoteLoadedOnlyWhenNamed = 1;

}  // namespace quazor
