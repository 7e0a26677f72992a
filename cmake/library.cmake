# libtrllocator: the objects of every layer in one library, exporting the API of include/trl.
# The link dependencies are those the layers have privately; none of them shows in the headers.
set(TRL_LIBRARY_LAYERS trl_platform trl_reporter trl_schema trl_frame trl_search trl_compare
                       trl_filter trl_merge trl_locate trl_server_objects)
add_library(trllocator_library)
foreach(layer IN LISTS TRL_LIBRARY_LAYERS)
  target_sources(trllocator_library PRIVATE $<TARGET_OBJECTS:${layer}>)
endforeach()
target_include_directories(trllocator_library PUBLIC
  $<BUILD_INTERFACE:${PROJECT_SOURCE_DIR}/include>
  $<INSTALL_INTERFACE:${CMAKE_INSTALL_INCLUDEDIR}>)
target_compile_features(trllocator_library PUBLIC cxx_std_20)
target_link_libraries(trllocator_library PRIVATE
  fmt::fmt Threads::Threads pugixml::pugixml PkgConfig::PCRE2 PkgConfig::UTF8PROC OpenSSL::Crypto
  SQLite::SQLite3 ${CMAKE_DL_LIBS})

# Before 1.0 every minor release may change the interface, so the soname carries both numbers.
if(PROJECT_VERSION_MAJOR EQUAL 0)
  set(TRL_SOVERSION ${PROJECT_VERSION_MAJOR}.${PROJECT_VERSION_MINOR})
else()
  set(TRL_SOVERSION ${PROJECT_VERSION_MAJOR})
endif()
# The command is named trllocator too, so the library target has a name of its own.
set_target_properties(trllocator_library PROPERTIES
  OUTPUT_NAME trllocator
  EXPORT_NAME trllocator
  VERSION ${PROJECT_VERSION}
  SOVERSION ${TRL_SOVERSION})
add_library(trlLocator::trllocator ALIAS trllocator_library)
