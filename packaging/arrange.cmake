# cpack runs this between installing into the staging directory and packing it.

function(compress)
  execute_process(COMMAND gzip -9 --no-name ${ARGV} COMMAND_ERROR_IS_FATAL ANY)
endfunction()

# Turns what is installed anywhere into what Debian's policy asks of a package.
function(arrange_for_debian)
  set(share ${CPACK_TEMPORARY_DIRECTORY}/usr/share)
  set(documents ${share}/doc/${CPACK_PACKAGE_NAME})

  # Zsh there looks for packages' completions in a directory of their own.
  file(RENAME ${share}/zsh/site-functions ${share}/zsh/vendor-completions)

  file(GLOB_RECURSE pages ${share}/man/*.[1-9])
  if(pages)
    compress(${pages})
  endif()

  # The version has no revision of Debian's, so its one changelog is called "changelog". The date is the
  # moment of packing, or SOURCE_DATE_EPOCH.
  string(TIMESTAMP date "%a, %d %b %Y %H:%M:%S +0000" UTC)
  file(WRITE ${documents}/changelog
    "${CPACK_PACKAGE_NAME} (${CPACK_PACKAGE_VERSION}) unstable; urgency=medium\n\n"
    "  * For what changed see /usr/share/doc/${CPACK_PACKAGE_NAME}/CHANGELOG.md.\n\n"
    " -- ${CPACK_PACKAGE_CONTACT}  ${date}\n")
  compress(${documents}/changelog)

  file(COPY ${CPACK_QEL_COPYRIGHT} DESTINATION ${documents})
endfunction()

if(CPACK_GENERATOR STREQUAL "DEB")
  arrange_for_debian()
endif()

# Whatever the umask of whoever made the clone or the package.
execute_process(COMMAND chmod -R u=rwX,go=rX ${CPACK_TEMPORARY_DIRECTORY} COMMAND_ERROR_IS_FATAL ANY)
