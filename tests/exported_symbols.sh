#!/bin/sh
# The appliance's libraries resolve these C names from the executable.
binary=${1:?usage: exported_symbols.sh DAVSYNC}
missing=0
for symbol in search_xml_children recover_special_char free_xml_memory itoa bitmap; do
    if ! nm -D --defined-only "$binary" | awk '{print $NF}' | grep -qx "$symbol"; then
        echo "not exported as a dynamic C symbol: $symbol"
        missing=1
    fi
done
[ "$missing" -eq 0 ] && echo "all five symbols exported"
exit "$missing"
