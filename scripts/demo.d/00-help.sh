# The commands the tool offers.
"$tool" --help | sed -n '/^Commands:/,/^$/p'
