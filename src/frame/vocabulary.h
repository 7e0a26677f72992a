#pragma once

#include <string_view>

// The element and attribute names of every document the component reads and writes, spelled once.
namespace trl::vocab {

// Elements.
inline constexpr std::string_view c = "c";
inline constexpr std::string_view m = "m";
inline constexpr std::string_view d = "d";
inline constexpr std::string_view a = "a";
inline constexpr std::string_view v = "v";
inline constexpr std::string_view f = "f";
inline constexpr std::string_view p = "p";
inline constexpr std::string_view e = "e";
inline constexpr std::string_view n = "n";
inline constexpr std::string_view o = "o";
inline constexpr std::string_view l = "l";  // a link to a folder, under its drive
inline constexpr std::string_view d_search_mask = "d_search_mask";
// A folder the walk leaves out: a glob on its name or its path, one element each.
inline constexpr std::string_view d_search_exclude = "d_search_exclude";
inline constexpr std::string_view v_history = "v_history";
inline constexpr std::string_view a_missing_list =
    "a_missing";  // the list under the user-data root
inline constexpr std::string_view results_root = "trl_applicationdata";
inline constexpr std::string_view fingerprint_root =
    "trl_fingerprint";  // root of a database the command line creates
inline constexpr std::string_view events = "events";
inline constexpr std::string_view event = "event";
// What a compare that explains keeps besides the matches: a version it took back, with its place,
// and a property of a found file that disagreed.
inline constexpr std::string_view taken_back = "taken_back";
inline constexpr std::string_view p_local = "p_local";

// Attributes.
inline constexpr std::string_view a_dupes_q = "a_dupes_q";
inline constexpr std::string_view a_guid = "a_guid";
inline constexpr std::string_view a_id = "a_id";
inline constexpr std::string_view a_manage = "a_manage";
inline constexpr std::string_view a_max_seq = "a_max_seq";
inline constexpr std::string_view a_missing = "a_missing";
inline constexpr std::string_view a_name = "a_name";
inline constexpr std::string_view a_parent = "a_parent";
inline constexpr std::string_view a_selected = "a_selected";
inline constexpr std::string_view a_update_q = "a_update_q";
inline constexpr std::string_view c_id = "c_id";
inline constexpr std::string_view c_local = "c_local";
inline constexpr std::string_view c_name = "c_name";
inline constexpr std::string_view c_text = "c_text";
inline constexpr std::string_view d_id = "d_id";
inline constexpr std::string_view d_name = "d_name";
inline constexpr std::string_view d_search = "d_search";
inline constexpr std::string_view d_search_d_attributes = "d_search_d_attributes";
inline constexpr std::string_view d_search_f_attributes = "d_search_f_attributes";
inline constexpr std::string_view d_search_f_properties = "d_search_f_properties";
inline constexpr std::string_view d_search_f_links = "d_search_f_links";
inline constexpr std::string_view d_search_links = "d_search_links";
inline constexpr std::string_view d_search_recurse = "d_search_recurse";
inline constexpr std::string_view d_text = "d_text";
inline constexpr std::string_view l_target = "l_target";
inline constexpr std::string_view l_text = "l_text";
inline constexpr std::string_view e_a_count = "e_a_count";
inline constexpr std::string_view e_a_total = "e_a_total";
inline constexpr std::string_view e_d_count = "e_d_count";
inline constexpr std::string_view e_d_name = "e_d_name";
inline constexpr std::string_view e_f_count = "e_f_count";
inline constexpr std::string_view e_match_count = "e_match_count";
inline constexpr std::string_view e_match_merged = "e_match_merged";
inline constexpr std::string_view e_match_missing = "e_match_missing";
inline constexpr std::string_view e_match_total = "e_match_total";
inline constexpr std::string_view e_match_total_new = "e_match_total_new";
inline constexpr std::string_view e_match_total_old = "e_match_total_old";
inline constexpr std::string_view e_matched = "e_matched";
inline constexpr std::string_view e_mode = "e_mode";
inline constexpr std::string_view e_status = "e_status";
inline constexpr std::string_view f_act = "f_act";
inline constexpr std::string_view f_bitmask = "f_bitmask";
inline constexpr std::string_view f_exists = "f_exists";
inline constexpr std::string_view f_fullpath = "f_fullpath";
inline constexpr std::string_view f_id = "f_id";
inline constexpr std::string_view f_max = "f_max";
inline constexpr std::string_view f_name = "f_name";
inline constexpr std::string_view f_relpath = "f_relpath";
inline constexpr std::string_view f_text = "f_text";
inline constexpr std::string_view f_weight = "f_weight";
inline constexpr std::string_view m_id = "m_id";
inline constexpr std::string_view m_name = "m_name";
inline constexpr std::string_view m_text = "m_text";
inline constexpr std::string_view m_type = "m_type";
inline constexpr std::string_view p_act = "p_act";
inline constexpr std::string_view p_bitmask = "p_bitmask";
inline constexpr std::string_view p_expected = "p_expected";
inline constexpr std::string_view p_max = "p_max";
inline constexpr std::string_view p_type = "p_type";
inline constexpr std::string_view p_value = "p_value";
inline constexpr std::string_view p_weight = "p_weight";
inline constexpr std::string_view v_act = "v_act";
inline constexpr std::string_view v_guess = "v_guess";
inline constexpr std::string_view v_id = "v_id";
inline constexpr std::string_view v_max = "v_max";
inline constexpr std::string_view v_name = "v_name";
inline constexpr std::string_view v_seq = "v_seq";
inline constexpr std::string_view v_update_q = "v_update_q";
inline constexpr std::string_view v_updated = "v_updated";
inline constexpr std::string_view v_weight = "v_weight";
inline constexpr std::string_view search_start = "search_start";
inline constexpr std::string_view search_end = "search_end";
inline constexpr std::string_view compare_start = "compare_start";
inline constexpr std::string_view compare_end = "compare_end";
inline constexpr std::string_view cancelled = "cancelled";

}  // namespace trl::vocab
