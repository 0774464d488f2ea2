# What a Debian package has besides what is installed. CPack runs it before it packs, with DESTDIR
# still set.
set(documents /usr/share/doc/${CPACK_PACKAGE_NAME})

file(INSTALL ${CMAKE_CURRENT_LIST_DIR}/lintian-overrides DESTINATION /usr/share/lintian/overrides
  RENAME ${CPACK_PACKAGE_NAME})
file(INSTALL ${CMAKE_CURRENT_LIST_DIR}/changelog DESTINATION ${documents})
execute_process(
  COMMAND gzip --best --no-name $ENV{DESTDIR}${documents}/changelog
    $ENV{DESTDIR}/usr/share/man/man8/tzdata-select.8
  COMMAND_ERROR_IS_FATAL ANY)
# Whatever the umask of whoever packs.
execute_process(COMMAND chmod -R u=rwX,go=rX $ENV{DESTDIR} COMMAND_ERROR_IS_FATAL ANY)
