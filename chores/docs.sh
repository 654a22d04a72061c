# shellcheck shell=sh
# The site.

#@ docs   Build the reference and the guides, as pages for a browser (build/docs/html)
#
# Usage: ./dev docs
#
# The reference is made from the headers' comments and the binding definitions, the layout of
# records from what the compiler makes of them. A warning is an error, and so is a link that leads
# nowhere.
cmd_docs() {
  [ $# -eq 0 ] || die "docs takes no options"
  # shellcheck disable=SC2086 # a list of words
  need $docs_packages
  asked_python=''
  configure
  step "Building the pages in $folder/docs/html"
  flock "$folder/.lock" nice cmake --build "$folder" --target layout
  # Afresh: Sphinx does not see when what makes the reference has changed.
  BUILD_DIR=$root/$folder "$python" -m sphinx -E -W --keep-going -n -q \
    -d "$folder/docs/doctrees" docs "$folder/docs/html"
  "$python" docs/check_links.py "$folder/docs/html"
  say "Open $folder/docs/html/index.html"
}
