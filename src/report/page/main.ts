const place = document.getElementById('report')!;
place.textContent = document.getElementById('report-data')!.textContent;
