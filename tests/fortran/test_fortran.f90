! The Fortran module through a model engine's eyes: a 2-D field written over
! time and read back equal (with a jump to one time step), a static item
! written and read back, the texts that come back as Fortran strings, unit
! keys and conversions, and an error path that reports a status and its text.
program test_fortran
  use tova
  implicit none
  integer, parameter :: nx = 7, ny = 5, steps = 6
  character(len=*), parameter :: path = "fortran test.grd"
  real(c_float) :: field(nx, ny), back(nx, ny), bed(nx, ny), bedBack(nx, ny)
  real(c_double) :: time, metres, minimum, maximum
  type(c_ptr) :: header, file, item
  integer(c_int32_t) :: status, level, metre, foot, unit, n, dataType, found, inHeader
  character(len=:), allocatable :: name, unitText, date, clock
  real(c_double), pointer :: edges(:)
  type(c_ptr) :: edgesPtr
  integer :: failures, t

  failures = 0

  ! Unit keys and conversions.
  call expect(qtyGetItemTypeTag("WaterLevel", level), "quantity key")
  call expect(qtyGetUnitTag("m  ", metre), "unit key, trailing blanks dropped")
  call expect(qtyGetUnitTag("ft", foot), "unit key ft")
  call expect(qtyGetUnitKey(metre) == "m", "unit key as text")
  call expect(qtyGetItemTypeKey(level) == "WaterLevel", "quantity key as text")
  call expect(qtyConvertUnit(foot, 10.0d0, metre, metres) /= 0 .and. abs(metres - 3.048d0) < 1d-12, "ft to m")
  call expect(.not. qtyGetUnitTag("no such unit", unit), "unknown unit")

  ! Write: header, static item, then the engine's loop.
  call ok(grdHeaderCreate(F_EQTIME_FIXEDSPACE_ALLITEMS, "Fortran test", "test_fortran", 3, 1, &
                          F_ITEM_STATS_GLOBAL, header), "header")
  call ok(grdSetAppTitle(header, "engine under test   "), "app title")
  call ok(grdSetItemInfo(header, grdItemD(header, 1), level, "Water level", metre, RCF_FLOAT), "item")
  call ok(grdSetItemAxisEqD2(grdItemD(header, 1), metre, nx, ny, 0.0, 0.0, 10.0, 10.0), "axis")
  call ok(grdSetEqCalendarAxis(header, "2025-03-01", "12:00:00", QTY_UNIT_SECOND, 0.0d0, 60.0d0, 0), "time axis")
  call ok(grdFileCreate(path, header, file), "create")
  bed = reshape([(-real(n), n = 1, nx * ny)], [nx, ny])
  call ok(grdStaticCreate(item), "static create")
  call ok(grdStaticSetHeader(header, item), "static header")
  call ok(grdSetItemInfo(header, item, QTY_ITEM_UNDEFINED, "Bed", metre, RCF_FLOAT), "static info")
  call ok(grdSetItemAxisEqD2(item, metre, nx, ny, 0.0, 0.0, 10.0, 10.0), "static axis")
  call ok(grdStaticWrite(item, file, bed), "static write")
  call ok(grdStaticDestroy(item), "static destroy")
  do t = 0, steps - 1
    call fill(field, t)
    call ok(grdWriteItemTimeStep(header, file, t * 60.0d0, field), "write")
  end do
  call ok(grdFileClose(header, file), "close")
  call expect(.not. c_associated(file), "close nulls the file")
  call ok(grdHeaderDestroy(header), "destroy")

  ! Read back: texts, the static item, every step, then a jump.
  call ok(grdFileRead(path, header, file), "read")
  call expect(grdGetFileTitle(header) == "Fortran test", "file title")
  call expect(grdGetAppTitle(header) == "engine under test", "application title, trailing blanks dropped")
  call ok(grdGetItemInfo(grdItemD(header, 1), name=name, unitText=unitText, dataType=dataType), "item info")
  call expect(name == "Water level" .and. unitText == "m" .and. dataType == RCF_FLOAT, "item info values")
  call ok(grdGetCalendarAxis(header, date, clock, noOfTimeSteps=n), "calendar axis")
  call expect(date == "2025-03-01" .and. clock == "12:00:00" .and. n == steps, "calendar axis values")
  call ok(grdGetItemStatsGlobal(grdItemD(header, 1), minimum, maximum), "statistics")
  call expect(minimum == 0.0d0 .and. maximum == real(steps - 2 + nx * ny, c_double), "statistics values")

  item = grdStaticRead(file, status)
  call ok(status, "static read")
  call ok(grdStaticGetData(item, bedBack), "static data")
  call expect(all(bedBack == bed), "static values")
  call ok(grdStaticDestroy(item), "static destroy")
  do t = 0, steps - 1
    call fill(field, t)
    call ok(grdReadItemTimeStep(header, file, time, back), "read step")
    call expect(all(back == field) .and. time == real(t, c_double), "time step values")
  end do
  call ok(grdFindTimeStep(header, file, 2), "find")
  call ok(grdReadItemTimeStep(header, file, time, back), "read after find")
  call fill(field, 2)
  call expect(all(back == field), "values after find")

  ! Error paths: a status with its text, and the file stays usable.
  status = grdFindTimeStep(header, file, steps + 1)
  call expect(status == F_ERR_TIMESTEP_RANGE, "time step out of range")
  call expect(index(grdGetStatusText(F_ERR_OPEN), "F_ERR_OPEN") == 1, "status text")
  status = grdWriteItemTimeStep(header, file, 0.0d0, field)
  call expect(status /= F_NO_ERROR, "writing to a file open for reading fails")
  call ok(grdFileClose(header, file), "close read")
  call ok(grdHeaderDestroy(header), "destroy read")
  status = grdFileRead("no such folder/none.grd", header, file)
  call expect(status == F_ERR_OPEN .and. .not. c_associated(file), "missing file")

  ! A non-equidistant axis: its boundaries come back lent by the header.
  call ok(grdHeaderCreate(F_NEQTIME_FIXEDSPACE_ALLITEMS, "Axes", "test_fortran", 1, 1, F_ITEM_STATS_GLOBAL, &
                          header), "header 2")
  call ok(grdSetItemInfo(header, grdItemD(header, 1), level, "Level", metre, RCF_DOUBLE), "item 2")
  call ok(grdSetItemAxisNeqD1(grdItemD(header, 1), metre, 3, [0.0d0, 1.0d0, 3.0d0, 7.0d0], 0), "neq axis")
  call ok(grdGetItemAxisNeqD1(grdItemD(header, 1), xSize=n, xCoords=edgesPtr), "neq axis back")
  call c_f_pointer(edgesPtr, edges, [n + 1])
  call expect(n == 3 .and. all(edges == [0.0d0, 1.0d0, 3.0d0, 7.0d0]), "neq axis values")
  call ok(grdHeaderDestroy(header), "destroy 2")

  ! A consistent file is left as it is by recovery.
  call ok(grdFileRecover(path, found, inHeader), "recover")
  call expect(found == steps .and. inHeader == steps, "recover counts")
  call ok(grdFileDelete(path), "delete")

  if (failures > 0) then
    print '(i0, a)', failures, " check(s) failed"
    error stop 1
  end if
  print '(a)', "test_fortran: all checks passed"

contains

  subroutine fill(values, t)
    real(c_float), intent(out) :: values(nx, ny)
    integer, intent(in) :: t
    integer :: i, j
    do j = 1, ny
      do i = 1, nx
        values(i, j) = real(t + i - 1 + (j - 1) * nx)
      end do
    end do
  end subroutine

  subroutine ok(status, what)
    integer(c_int32_t), intent(in) :: status
    character(len=*), intent(in) :: what
    if (status /= F_NO_ERROR) then
      print '(a)', "FAILED: " // what // ": " // grdGetStatusText(status)
      failures = failures + 1
    end if
  end subroutine

  subroutine expect(condition, what)
    logical, intent(in) :: condition
    character(len=*), intent(in) :: what
    if (.not. condition) then
      print '(a)', "FAILED: " // what
      failures = failures + 1
    end if
  end subroutine
end program
