# Writes OUTPUT, a C++ source with the signature of the catalogue text TEXT and the date of now.
# SOURCE_DATE_EPOCH in the environment, if set, is now.
file(MD5 "${TEXT}" signature)
string(TIMESTAMP built "%b %d %Y %H:%M:%S" UTC)
file(WRITE "${OUTPUT}" "#include \"knvlibs/source.h\"

const ksi::Definitions ksi::kDefinitions = {\"${signature}\", \"${built}\"};
")
