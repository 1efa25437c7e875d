# What Doxygen reads in place of the lines of a page.

# Programs are included in comments, which other readers of Markdown pass over.
s|^<!--! \(.*\) -->$|\1|

# Classes and their operations become links. One that does not exist is a warning.
s/`\(AdapterList\|Adapter\|Agent\|AudioSink\|Audio\|AutoConnect\|BluezObject\|Connection\|Control\|DBusObject\|DeviceList\|Device\|Fifo\|Manager\|ObjectPath\|RemoteObject\|ScannerObject\|ScannerServer\|Scanner\|ServerObject\)`/@ref Bluetooth::\1 "\1"/g
s/`\(AdapterList\|Adapter\|Agent\|AudioSink\|Audio\|AutoConnect\|BluezObject\|Connection\|Control\|DBusObject\|DeviceList\|Device\|Fifo\|Manager\|ObjectPath\|RemoteObject\|ScannerObject\|ScannerServer\|Scanner\|ServerObject\)::\([A-Za-z]*\)()`/@ref Bluetooth::\1::\2 "\1::\2()"/g
