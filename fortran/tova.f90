! The Fortran interface of tova: module `tova` (Fortran 2008 with
! iso_c_binding). Handles are type(c_ptr). It gives everything of `tova_c`
! (constants and the functions without texts, bound directly) and, here, the
! functions that take or give texts: they accept ordinary Fortran strings
! (trailing blanks are dropped, the terminating zero is added here) and give
! back allocatable strings. Every function returns the status of the C call
! (F_NO_ERROR or a named code); grdGetStatusText gives its text.
module tova
  use, intrinsic :: iso_c_binding
  use tova_c
  implicit none
  private :: cstr, fstr, open_file, set_title

contains

  ! A Fortran string as a C string: trailing blanks dropped, zero added.
  pure function cstr(text) result(c)
    character(len=*), intent(in) :: text
    character(kind=c_char, len=:), allocatable :: c
    c = trim(text)//c_null_char
  end function

  ! A C string lent by the library as a Fortran string ("" for null).
  function fstr(p) result(text)
    type(c_ptr), intent(in) :: p
    character(len=:), allocatable :: text
    character(kind=c_char), pointer :: chars(:)
    integer :: i, n
    interface
      integer(c_size_t) function c_strlen(text) bind(C, name="strlen")
        import; type(c_ptr), value :: text
      end function
    end interface
    if (.not. c_associated(p)) then
      text = ""
      return
    end if
    n = int(c_strlen(p))
    call c_f_pointer(p, chars, [n])
    allocate(character(len=n) :: text)
    do i = 1, n
      text(i:i) = chars(i)
    end do
  end function

  !> The fixed text of a status code, e.g. "F_ERR_OPEN: the file could not be opened".
  function grdGetStatusText(status) result(text)
    integer(c_int32_t), intent(in) :: status
    character(len=:), allocatable :: text
    interface
      type(c_ptr) function c_text(status) bind(C, name="grdGetStatusText")
        import; integer(c_int32_t), value :: status
      end function
    end interface
    text = fstr(c_text(status))
  end function

  !> Makes a header of noOfItems items; header is c_null_ptr on failure.
  integer(c_int32_t) function grdHeaderCreate(fileType, fileTitle, appTitle, appVersionNo, noOfItems, &
      statsType, header) result(status)
    integer(c_int32_t), intent(in) :: fileType, appVersionNo, noOfItems, statsType
    character(len=*), intent(in) :: fileTitle, appTitle
    type(c_ptr), intent(out) :: header
    interface
      integer(c_int32_t) function c_create(fileType, fileTitle, appTitle, appVersionNo, noOfItems, statsType, &
          header) bind(C, name="grdHeaderCreate")
        import; integer(c_int32_t), value :: fileType, appVersionNo, noOfItems, statsType
        character(kind=c_char), intent(in) :: fileTitle(*), appTitle(*); type(c_ptr), intent(out) :: header
      end function
    end interface
    status = c_create(fileType, cstr(fileTitle), cstr(appTitle), appVersionNo, noOfItems, statsType, header)
  end function

  function grdGetFileTitle(header) result(text)
    type(c_ptr), intent(in) :: header
    character(len=:), allocatable :: text
    interface
      type(c_ptr) function c_get(header) bind(C, name="grdGetFileTitle")
        import; type(c_ptr), value :: header
      end function
    end interface
    text = fstr(c_get(header))
  end function

  function grdGetAppTitle(header) result(text)
    type(c_ptr), intent(in) :: header
    character(len=:), allocatable :: text
    interface
      type(c_ptr) function c_get(header) bind(C, name="grdGetAppTitle")
        import; type(c_ptr), value :: header
      end function
    end interface
    text = fstr(c_get(header))
  end function

  integer(c_int32_t) function grdSetGeoInfoUTMProj(header, projection, longitude, latitude, orientation) &
      result(status)
    type(c_ptr), intent(in) :: header
    character(len=*), intent(in) :: projection
    real(c_double), intent(in) :: longitude, latitude, orientation
    interface
      integer(c_int32_t) function c_set(header, projection, longitude, latitude, orientation) &
          bind(C, name="grdSetGeoInfoUTMProj")
        import; type(c_ptr), value :: header; character(kind=c_char), intent(in) :: projection(*)
        real(c_double), value :: longitude, latitude, orientation
      end function
    end interface
    status = c_set(header, cstr(projection), longitude, latitude, orientation)
  end function

  !> Name, quantity type, unit and element type of an item (or static item).
  integer(c_int32_t) function grdSetItemInfo(header, item, itemType, name, unit, dataType) result(status)
    type(c_ptr), intent(in) :: header, item
    integer(c_int32_t), intent(in) :: itemType, unit, dataType
    character(len=*), intent(in) :: name
    interface
      integer(c_int32_t) function c_set(header, item, itemType, name, unit, dataType) bind(C, name="grdSetItemInfo")
        import; type(c_ptr), value :: header, item; integer(c_int32_t), value :: itemType, unit, dataType
        character(kind=c_char), intent(in) :: name(*)
      end function
    end interface
    status = c_set(header, item, itemType, cstr(name), unit, dataType)
  end function

  integer(c_int32_t) function grdGetItemInfo(item, itemType, itemTypeText, name, unit, unitText, dataType) &
      result(status)
    type(c_ptr), intent(in) :: item
    integer(c_int32_t), intent(out), optional :: itemType, unit, dataType
    character(len=:), allocatable, intent(out), optional :: itemTypeText, name, unitText
    integer(c_int32_t) :: t, u, d
    type(c_ptr) :: tt, nn, ut
    interface
      integer(c_int32_t) function c_get(item, itemType, itemTypeText, name, unit, unitText, dataType) &
          bind(C, name="grdGetItemInfo")
        import; type(c_ptr), value :: item; integer(c_int32_t) :: itemType, unit, dataType
        type(c_ptr) :: itemTypeText, name, unitText
      end function
    end interface
    t = 0; u = 0; d = 0
    tt = c_null_ptr; nn = c_null_ptr; ut = c_null_ptr
    status = c_get(item, t, tt, nn, u, ut, d)
    if (present(itemType)) itemType = t
    if (present(unit)) unit = u
    if (present(dataType)) dataType = d
    if (present(itemTypeText)) itemTypeText = fstr(tt)
    if (present(name)) name = fstr(nn)
    if (present(unitText)) unitText = fstr(ut)
  end function

  integer(c_int32_t) function grdSetEqCalendarAxis(header, startDate, startTime, unit, startOffset, timeStep, &
      firstIndex) result(status)
    type(c_ptr), intent(in) :: header
    character(len=*), intent(in) :: startDate, startTime
    integer(c_int32_t), intent(in) :: unit, firstIndex
    real(c_double), intent(in) :: startOffset, timeStep
    interface
      integer(c_int32_t) function c_set(header, startDate, startTime, unit, startOffset, timeStep, firstIndex) &
          bind(C, name="grdSetEqCalendarAxis")
        import; type(c_ptr), value :: header; character(kind=c_char), intent(in) :: startDate(*), startTime(*)
        integer(c_int32_t), value :: unit, firstIndex; real(c_double), value :: startOffset, timeStep
      end function
    end interface
    status = c_set(header, cstr(startDate), cstr(startTime), unit, startOffset, timeStep, firstIndex)
  end function

  integer(c_int32_t) function grdSetNeqCalendarAxis(header, startDate, startTime, unit, startOffset, firstIndex) &
      result(status)
    type(c_ptr), intent(in) :: header
    character(len=*), intent(in) :: startDate, startTime
    integer(c_int32_t), intent(in) :: unit, firstIndex
    real(c_double), intent(in) :: startOffset
    interface
      integer(c_int32_t) function c_set(header, startDate, startTime, unit, startOffset, firstIndex) &
          bind(C, name="grdSetNeqCalendarAxis")
        import; type(c_ptr), value :: header; character(kind=c_char), intent(in) :: startDate(*), startTime(*)
        integer(c_int32_t), value :: unit, firstIndex; real(c_double), value :: startOffset
      end function
    end interface
    status = c_set(header, cstr(startDate), cstr(startTime), unit, startOffset, firstIndex)
  end function

  !> A calendar axis of either kind (equidistant or not): start date and time
  !> as texts, the unit, the time step (0 for a non-equidistant axis), the
  !> number of time steps.
  integer(c_int32_t) function grdGetCalendarAxis(header, startDate, startTime, unit, timeStep, noOfTimeSteps) &
      result(status)
    type(c_ptr), intent(in) :: header
    character(len=:), allocatable, intent(out), optional :: startDate, startTime
    integer(c_int32_t), intent(out), optional :: unit, noOfTimeSteps
    real(c_double), intent(out), optional :: timeStep
    type(c_ptr) :: d, t, ut
    integer(c_int32_t) :: u, n, first
    real(c_double) :: offset, step
    abstract interface
      integer(c_int32_t) function c_get(header, unit, unitText, startDate, startTime, startOffset, timeStep, &
          noOfTimeSteps, firstIndex) bind(C)
        import; type(c_ptr), value :: header; integer(c_int32_t) :: unit, noOfTimeSteps, firstIndex
        type(c_ptr) :: unitText, startDate, startTime; real(c_double) :: startOffset, timeStep
      end function
    end interface
    procedure(c_get), bind(C, name="grdGetEqCalendarAxis") :: c_eq
    procedure(c_get), bind(C, name="grdGetNeqCalendarAxis") :: c_neq
    d = c_null_ptr; t = c_null_ptr; ut = c_null_ptr
    u = 0; n = 0; first = 0; offset = 0; step = 0
    if (grdGetTimeAxisType(header) == F_CAL_NEQ_AXIS) then
      status = c_neq(header, u, ut, d, t, offset, step, n, first)
    else
      status = c_eq(header, u, ut, d, t, offset, step, n, first)
    end if
    if (present(startDate)) startDate = fstr(d)
    if (present(startTime)) startTime = fstr(t)
    if (present(unit)) unit = u
    if (present(timeStep)) timeStep = step
    if (present(noOfTimeSteps)) noOfTimeSteps = n
  end function

  ! ---- Opening files by name ---------------------------------------------------
  !> Creates a file and writes the header; file is c_null_ptr on failure.
  integer(c_int32_t) function grdFileCreate(name, header, file) result(status)
    character(len=*), intent(in) :: name
    type(c_ptr), intent(in) :: header
    type(c_ptr), intent(out) :: file
    interface
      integer(c_int32_t) function c_create(name, header, file) bind(C, name="grdFileCreate")
        import; character(kind=c_char), intent(in) :: name(*); type(c_ptr), value :: header
        type(c_ptr), intent(out) :: file
      end function
    end interface
    file = c_null_ptr
    status = c_create(cstr(name), header, file)
  end function

  !> Opens a file for reading: a new header and the file.
  integer(c_int32_t) function grdFileRead(name, header, file) result(status)
    character(len=*), intent(in) :: name
    type(c_ptr), intent(out) :: header, file
    status = open_file(1, name, header, file)
  end function

  !> Opens a file for reading and writing from the cursor.
  integer(c_int32_t) function grdFileEdit(name, header, file) result(status)
    character(len=*), intent(in) :: name
    type(c_ptr), intent(out) :: header, file
    status = open_file(2, name, header, file)
  end function

  !> Opens a file to add time steps after its last complete one.
  integer(c_int32_t) function grdFileAppend(name, header, file) result(status)
    character(len=*), intent(in) :: name
    type(c_ptr), intent(out) :: header, file
    status = open_file(3, name, header, file)
  end function

  integer(c_int32_t) function open_file(how, name, header, file) result(status)
    integer, intent(in) :: how
    character(len=*), intent(in) :: name
    type(c_ptr), intent(out) :: header, file
    abstract interface
      integer(c_int32_t) function c_open(name, header, file) bind(C)
        import; character(kind=c_char), intent(in) :: name(*); type(c_ptr), intent(out) :: header, file
      end function
    end interface
    procedure(c_open), bind(C, name="grdFileRead") :: c_read
    procedure(c_open), bind(C, name="grdFileEdit") :: c_edit
    procedure(c_open), bind(C, name="grdFileAppend") :: c_append
    header = c_null_ptr
    file = c_null_ptr
    select case (how)
    case (1)
      status = c_read(cstr(name), header, file)
    case (2)
      status = c_edit(cstr(name), header, file)
    case default
      status = c_append(cstr(name), header, file)
    end select
  end function

  integer(c_int32_t) function grdFileDelete(name) result(status)
    character(len=*), intent(in) :: name
    interface
      integer(c_int32_t) function c_delete(name) bind(C, name="grdFileDelete")
        import; character(kind=c_char), intent(in) :: name(*)
      end function
    end interface
    status = c_delete(cstr(name))
  end function

  !> After a crash: makes the header count the complete time steps on disk.
  integer(c_int32_t) function grdFileRecover(name, stepsFound, stepsInHeader) result(status)
    character(len=*), intent(in) :: name
    integer(c_int32_t), intent(out), optional :: stepsFound, stepsInHeader
    integer(c_int32_t) :: found, inHeader
    interface
      integer(c_int32_t) function c_recover(name, found, inHeader) bind(C, name="grdFileRecover")
        import; character(kind=c_char), intent(in) :: name(*); integer(c_int32_t) :: found, inHeader
      end function
    end interface
    found = 0; inHeader = 0
    status = c_recover(cstr(name), found, inHeader)
    if (present(stepsFound)) stepsFound = found
    if (present(stepsInHeader)) stepsInHeader = inHeader
  end function

  integer(c_int32_t) function grdSetFileTitle(header, title) result(status)
    type(c_ptr), intent(in) :: header
    character(len=*), intent(in) :: title
    status = set_title(.true., header, title)
  end function

  integer(c_int32_t) function grdSetAppTitle(header, title) result(status)
    type(c_ptr), intent(in) :: header
    character(len=*), intent(in) :: title
    status = set_title(.false., header, title)
  end function

  integer(c_int32_t) function set_title(fileTitle, header, title) result(status)
    logical, intent(in) :: fileTitle
    type(c_ptr), intent(in) :: header
    character(len=*), intent(in) :: title
    abstract interface
      integer(c_int32_t) function c_set(header, title) bind(C)
        import; type(c_ptr), value :: header; character(kind=c_char), intent(in) :: title(*)
      end function
    end interface
    procedure(c_set), bind(C, name="grdSetFileTitle") :: c_file
    procedure(c_set), bind(C, name="grdSetAppTitle") :: c_app
    if (fileTitle) then
      status = c_file(header, cstr(title))
    else
      status = c_app(header, cstr(title))
    end if
  end function

  !> Counts without changing the file: complete time steps, those the header
  !> counts, and the bytes of an unfinished step after them.
  integer(c_int32_t) function grdFileScan(name, stepsFound, stepsInHeader, tailBytes) result(status)
    character(len=*), intent(in) :: name
    integer(c_int32_t), intent(out), optional :: stepsFound, stepsInHeader
    integer(c_int64_t), intent(out), optional :: tailBytes
    integer(c_int32_t) :: found, inHeader
    integer(c_int64_t) :: tail
    interface
      integer(c_int32_t) function c_scan(name, found, inHeader, tail) bind(C, name="grdFileScan")
        import; character(kind=c_char), intent(in) :: name(*); integer(c_int32_t) :: found, inHeader
        integer(c_int64_t) :: tail
      end function
    end interface
    found = 0; inHeader = 0; tail = 0
    status = c_scan(cstr(name), found, inHeader, tail)
    if (present(stepsFound)) stepsFound = found
    if (present(stepsInHeader)) stepsInHeader = inHeader
    if (present(tailBytes)) tailBytes = tail
  end function

  ! ---- Unit library: keys -------------------------------------------------------
  ! These return a logical: .true. when the key is known.

  !> Quantity type number of a text key such as "WaterLevel".
  logical function qtyGetItemTypeTag(text, itemType)
    character(len=*), intent(in) :: text
    integer(c_int32_t), intent(out) :: itemType
    interface
      integer(c_int) function c_tag(text, itemType) bind(C, name="qtyGetItemTypeTag")
        import; character(kind=c_char), intent(in) :: text(*); integer(c_int32_t) :: itemType
      end function
    end interface
    itemType = QTY_ITEM_UNDEFINED
    qtyGetItemTypeTag = c_tag(cstr(text), itemType) /= 0
  end function

  !> Unit number of a unit text such as "m/s".
  logical function qtyGetUnitTag(text, unit)
    character(len=*), intent(in) :: text
    integer(c_int32_t), intent(out) :: unit
    interface
      integer(c_int) function c_tag(text, unit) bind(C, name="qtyGetUnitTag")
        import; character(kind=c_char), intent(in) :: text(*); integer(c_int32_t) :: unit
      end function
    end interface
    unit = QTY_UNIT_UNDEFINED
    qtyGetUnitTag = c_tag(cstr(text), unit) /= 0
  end function

  !> Text key of a quantity type ("" when unknown).
  function qtyGetItemTypeKey(itemType) result(text)
    integer(c_int32_t), intent(in) :: itemType
    character(len=:), allocatable :: text
    type(c_ptr) :: p
    interface
      integer(c_int) function c_key(itemType, text) bind(C, name="qtyGetItemTypeKey")
        import; integer(c_int32_t), value :: itemType; type(c_ptr) :: text
      end function
    end interface
    p = c_null_ptr
    if (c_key(itemType, p) == 0) p = c_null_ptr
    text = fstr(p)
  end function

  !> Text key of a unit ("" when unknown).
  function qtyGetUnitKey(unit) result(text)
    integer(c_int32_t), intent(in) :: unit
    character(len=:), allocatable :: text
    type(c_ptr) :: p
    interface
      integer(c_int) function c_key(unit, text) bind(C, name="qtyGetUnitKey")
        import; integer(c_int32_t), value :: unit; type(c_ptr) :: text
      end function
    end interface
    p = c_null_ptr
    if (c_key(unit, p) == 0) p = c_null_ptr
    text = fstr(p)
  end function
end module tova
