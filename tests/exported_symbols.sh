#!/bin/sh
# The appliance's libraries resolve these C names from the executable, so each
# must be a defined dynamic symbol under its plain (unmangled) name.
binary=${1:?usage: exported_symbols.sh DAVSYNC}
if ! symbols=$(nm -D --defined-only "$binary"); then
    echo "cannot read the dynamic symbols of $binary"
    exit 2
fi
missing=0
for symbol in search_xml_children recover_special_char free_xml_memory itoa bitmap; do
    if ! printf '%s\n' "$symbols" | awk '{print $NF}' | grep -qx "$symbol"; then
        echo "not exported as a dynamic C symbol: $symbol"
        missing=1
    fi
done
[ "$missing" -eq 0 ] && echo "all five symbols exported"
exit "$missing"
