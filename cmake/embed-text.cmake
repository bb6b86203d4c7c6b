# Writes the text of IN into OUT as one C++ raw string literal.
file(READ ${IN} text)
string(FIND "${text}" ")chirrup_text\"" clash)
if(NOT clash EQUAL -1)
    message(FATAL_ERROR "${IN} holds the raw string's closing sequence")
endif()
file(WRITE ${OUT}.tmp "R\"chirrup_text(${text})chirrup_text\"\n")
file(RENAME ${OUT}.tmp ${OUT})
