#!/usr/bin/env bash
# Writes the starting inputs of every fuzz target, one folder per target, and a dictionary of the
# documents' element and attribute names, from the examples, the PE fixtures of the tests and small
# documents of each kind below. Documents of one input are separated by a line "===", and "{root}"
# names the small tree the search and compare targets walk.
# Usage: fuzz/make_starters.sh OUT-DIR
set -euo pipefail

here="$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)"
out="${1:?usage: make_starters.sh OUT-DIR}"
rm -rf "$out"
mkdir -p "$out"

# starter TARGET NAME PART...: one input of TARGET, its parts joined by separator lines.
starter() {
  local target="$1" name="$2"
  shift 2
  mkdir -p "$out/$target"
  local first=1
  for part in "$@"; do
    ((first)) || printf '\n===\n'
    printf '%s' "$part"
    first=0
  done >"$out/$target/$name"
}

# A search of the tree's application folder: every attribute, all four properties, a pattern, an
# excluded folder, noted links and a probe of application 1.
search_options='<trl_searchoptions><c c_id="1" c_text="localhost" c_name="localhost" c_local="1"><m m_id="1" m_text="" m_name="" m_type="3"><d d_id="1" d_text="{root}\app\" d_name="{root}\app\" d_search="1" d_search_recurse="True" d_search_d_attributes="35" d_search_f_attributes="35" d_search_f_properties="15" d_search_links="1"><d_search_mask>\.(md|js|exe)$</d_search_mask><d_search_exclude>empty</d_search_exclude><a a_id="1"/></d><d d_id="2" d_text="{root}\app\lib" d_search="1" d_search_recurse="0"><d_search_mask/></d></m></c></trl_searchoptions>'
remote_options='<trl_searchoptions><c c_id="1" c_text="server" c_name="server" c_local="0"><m m_id="1" m_text="share" m_name="share"><d d_id="1" d_text="\app\" d_search="1"><d_search_mask/></d></m></c></trl_searchoptions>'
application_options='<trl_applicationoptions a_selected="1"><a a_id="1" a_selected="1"/><a a_id="2" a_selected="0"/></trl_applicationoptions>'

# Two versions of an application made of the tree's files, a child application, and a file given
# by its whole folder.
fingerprint='<trl_fingerprint><a a_id="1" a_name="Tool"><v v_id="1" v_name="1.0" v_seq="1"><f f_id="1" f_name="README.md" f_relpath="" f_weight="0"><p p_type="2" p_weight="1" p_value="7"/><p p_type="3" p_weight="2" p_value="ef7b5181c1f63f8ca8eebaab0829ee38"/></f><f f_id="2" f_name="tool.exe" f_relpath="" f_weight="1"><p p_type="1" p_weight="3" p_value="65535.0.258.40000"/><p p_type="4" p_weight="1" p_value="2024-01-02 03:04:05"/></f><f f_id="3" f_name="core.js" f_relpath="lib" f_weight="1"><p p_type="2" p_weight="1" p_value="20"/><p p_type="3" p_weight="2" p_value="0c1d9e1731bb3d71b0b7a15695bfab14"/></f><n>note</n><o>other</o></v><v v_id="2" v_name="2.0" v_seq="2"><f f_id="1" f_name="core.js" f_relpath="{root}\app\lib" f_fullpath="True" f_weight="16"><p p_type="2" p_weight="1" p_value="21"/></f></v></a><a a_id="2" a_parent="1" a_name="Plugin"><v v_id="1" v_name="1" v_seq="1"><f f_id="1" f_name="readme.md" f_relpath="" f_weight="1"/></v></a></trl_fingerprint>'

local_files='<trl_applicationdata search_start="2024-01-02 03:04:05" search_end="2024-01-02 03:04:06"><c c_id="1" c_text="localhost" c_name="localhost" c_local="1"><m m_id="1" m_text="" m_name=""><d d_id="1" d_text="{root}\app\" d_name="{root}\app\"><f f_id="1" f_text="README.md" f_name="readme.md"><p p_type="2" p_value="7"/></f><f f_id="2" f_text="readme.md" f_name="readme.md%~readme.md"/><f f_id="3" f_text="tool.exe" f_name="tool.exe"/><l l_text="lib-link" l_target="\lib\"/></d><d d_id="2" d_text="{root}\app\lib\" d_name="{root}\app\lib\"><f f_id="4" f_text="core.js" f_name="core.js"/></d></m></c></trl_applicationdata>'

# What a compare makes of them: one folder with both versions, another with a partial copy.
version_one='<v v_id="1" v_name="1.0" v_seq="1" v_max="2" f_max="3" f_act="3" v_act="2"><f f_id="1" f_name="README.md" f_weight="0" f_exists="1" p_max="3" p_act="3"/><f f_id="2" f_name="tool.exe" f_weight="1" f_exists="1" p_max="3" p_act="3"/><f f_id="3" f_name="core.js" f_weight="1" f_exists="0"/><n>note</n><o>other</o></v>'
version_two='<v v_id="2" v_name="2.0" v_seq="2" v_max="1" f_max="2" f_act="2" v_act="1"><f f_id="1" f_name="README.md" f_weight="0" f_exists="1" p_max="3" p_act="1"/><f f_id="2" f_name="core.js" f_weight="1" f_exists="1" p_max="3" p_act="3"/></v>'
matches='<trl_applicationdata search_start="2024-01-02 03:04:05" compare_start="2024-01-02 03:04:06"><c c_id="1" c_text="localhost" c_name="localhost" c_local="1"><m m_id="1" m_text="" m_name=""><d d_id="1" d_text="\app\" d_name="\app\"><a a_id="1" a_name="Tool" a_max_seq="2">'"$version_one$version_two"'</a></d><d d_id="2" d_text="\app2\" d_name="\app2\"><a a_id="1" a_name="Tool" a_max_seq="2">'"$version_two"'</a><a a_id="2" a_name="Plugin" a_max_seq="1"><v v_id="1" v_name="1" v_seq="1" v_max="1" f_max="1" f_act="0" v_act="0"/></a></d></m></c></trl_applicationdata>'
filtered='<trl_applicationdata><c c_id="1" c_text="localhost" c_name="localhost" c_local="1"><m m_id="1" m_text="" m_name=""><d d_id="1" d_text="\app\" d_name="\app\"><a a_id="1" a_name="Tool" a_max_seq="2" a_manage="1" v_id="2" v_name="2.0" v_seq="2">'"$version_two"'</a></d></m></c></trl_applicationdata>'
user_data='<trl_applicationdata a_update_q="1" a_dupes_q="0"><c c_id="1" c_text="localhost" c_name="localhost" c_local="1"><m m_id="1" m_text="" m_name=""><d d_id="1" d_text="\app\" d_name="\app\"><a a_id="1" a_name="Tool" a_max_seq="2" a_manage="1" v_id="1" v_name="1.0" v_seq="1" a_guid="c1m1d1a1" a_update_q="1" a_dupes_q="1"><v v_id="1" v_name="1.0" v_seq="1"/><v_history><v v_id="0" v_name="0.9" v_seq="0" v_updated="2024-01-02 03:04:05" v_update_q="1"/></v_history></a></d><d d_id="2" d_text="\gone\" d_name="\gone\"><a a_id="2" a_name="Plugin" a_manage="1" v_id="1" v_name="1" v_seq="1" a_guid="c1m1d2a2"/></d></m></c><a_missing><a a_id="3" a_name="Old" a_manage="0" a_guid="c1m1d3a3" a_missing="1"/></a_missing></trl_applicationdata>'
merge_options='<trl_searchoptions><c c_id="1" c_text="localhost" c_name="localhost" c_local="1"><m m_id="1" m_text="" m_name=""><d d_id="1" d_text="\app\" d_name="\app\" d_search="1"><a a_id="1" a_manage="1"/></d><d d_id="2" d_text="\gone\" d_name="\gone\" d_search="1"><a a_id="2" a_manage="1"/></d></m></c></trl_searchoptions>'

starter search options "$search_options"
starter search probe "$search_options" "$application_options" "$fingerprint"
starter search add-to "$search_options" "" "" "$local_files"
starter search remote "$remote_options"
starter search example "$(sed 's#d_text="[^"]*"#d_text="{root}\\app\\"#' "$here/examples/search-options.xml")" \
  "$(cat "$here/examples/application-options.xml")"

starter compare tree "$application_options" "$local_files" "$fingerprint"
starter compare unselected "" "$local_files" "$fingerprint"
starter compare example "$(cat "$here/examples/application-options.xml")" "$local_files" \
  "$(cat "$here/examples/fingerprint.xml")"

for options in 0 1 2 4 8 16 32 63; do
  starter filter "options-$options" "$options" "$matches"
done

starter merge into-user-data "$merge_options" "$application_options" "$user_data" "$filtered"
starter merge first-run "$merge_options" "" "<trl_applicationdata/>" "$matches"
starter merge nothing-new "$merge_options" "$application_options" "$user_data" \
  "<trl_applicationdata/>"

mkdir -p "$out/xml_load"
for example in "$here"/examples/*.xml; do
  cp "$example" "$out/xml_load/"
done
for document in search_options fingerprint local_files matches user_data; do
  printf '%s' "${!document}" >"$out/xml_load/small-$document.xml"
done

# The first byte sets the size of the short reads.
mkdir -p "$out/pe_version"
for image in "$here"/tests/schema/data/*.exe; do
  { printf '\x07'; cat "$image"; } >"$out/pe_version/$(basename "$image")"
done

names=("README.md" "Straße İstanbul ǅ" "100%'s \"quoted\"" $'tab\there' $'\xff\xfe not UTF-8'
       'C:\Program Files\App\' $'\xef\x9c\x80 private use')
for i in "${!names[@]}"; do
  starter name_encoding "name-$i" "${names[$i]}"
done

for text in all 63 0 low-weights,missing-files low-file-count,duplicate-matches \
  flag-unknowns,flag-unmanaged; do
  starter filter_names "$text" "$text"
done

# The dictionary: every name of the document vocabulary as a tag and as an attribute, and the
# pieces the inputs are made of.
{
  grep -o '= "[a-z_]*"' "$here/src/frame/vocabulary.h" | sed 's/= "\(.*\)"/\1/' | sort -u |
    while read -r name; do
      printf '"<%s"\n" %s=\\""\n' "$name" "$name"
    done
  printf '%s\n' '"{root}"' '"\x0A===\x0A"' '"True"' '"-1"' '"\\"' '"</"' '"/>"' '"%~"'
} >"$out/documents.dict"
